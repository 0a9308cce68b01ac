#include "agent/shell/child.h"

#include <fcntl.h>
#include <spawn.h>
#include <sys/wait.h>
#include <unistd.h>

#include <algorithm>
#include <array>
#include <cerrno>
#include <csignal>
#include <iterator>
#include <map>
#include <mutex>
#include <utility>

#include "agent/shell/starts.h"

namespace cvagent::shell {

namespace {

constexpr int kSignalStatus = 128;

/// The processes that have been started and not yet waited for.
class Register {
public:
    /// How many kills were noted until now.
    std::size_t notes() {
        const std::lock_guard lock(guard_);
        return next_;
    }
    /// @param before notes() before it was started: an older note is of another process with this number
    void add(pid_t process, const std::shared_ptr<RunningProcess>& running, std::size_t before) {
        const std::lock_guard lock(guard_);
        for (std::size_t note = before; note < next_; ++note) {
            running->forced = running->forced || early_[note % early_.size()] == process;
        }
        running_[process] = running;
    }
    /// Its number may be another's by now.
    void remove(pid_t process, const std::shared_ptr<RunningProcess>& running) {
        const std::lock_guard lock(guard_);
        const auto found = running_.find(process);
        if (found != running_.end() && found->second == running) {
            running_.erase(found);
        }
    }
    std::shared_ptr<RunningProcess> find(pid_t process) {
        const std::lock_guard lock(guard_);
        const auto found = running_.find(process);
        return found != running_.end() ? found->second : nullptr;
    }
    std::vector<pid_t> readBy(pid_t thread) {
        const std::lock_guard lock(guard_);
        std::vector<pid_t> read;
        for (const auto& [process, running] : running_) {
            const std::lock_guard ofOne(running->guard);
            if (running->reader == thread && running->output >= 0) {
                read.push_back(process);
            }
        }
        return read;
    }
    void noteKill(pid_t process) {
        const std::lock_guard lock(guard_);
        const auto found = running_.find(process);
        if (found != running_.end()) {
            found->second->forced = true;
            return;
        }
        // Started, but not yet listed here; or the child of one that is.
        // Without memory of its own, for whoever kills cannot fail half-way.
        early_[next_++ % early_.size()] = process;
    }

private:
    std::mutex guard_;
    std::map<pid_t, std::shared_ptr<RunningProcess>> running_;
    std::array<pid_t, 64> early_{};  // the last ones
    std::size_t next_ = 0;           // counts all
};

Register& processes() {
    static Register only;
    return only;
}

/// Whoever reads there goes on. A pipe that is full keeps nobody waiting.
void wakeReader(int output) {
    const std::string pipe = "/proc/self/fd/" + std::to_string(output);
    const hosttools::Descriptor writing(open(pipe.c_str(), O_WRONLY | O_NONBLOCK | O_CLOEXEC));
    [[maybe_unused]] const ssize_t written = write(writing.get(), "", 1);
}

/// What the new process does to its descriptors before it begins.
class Actions {
public:
    Actions() { posix_spawn_file_actions_init(&actions_); }
    Actions(const Actions&) = delete;
    Actions& operator=(const Actions&) = delete;
    ~Actions() { posix_spawn_file_actions_destroy(&actions_); }

    int setUp(int output, bool silent) {
        const int error = posix_spawn_file_actions_adddup2(&actions_, output, STDOUT_FILENO);
        return error != 0 || !silent
                   ? error
                   : posix_spawn_file_actions_addopen(&actions_, STDERR_FILENO, "/dev/null", O_WRONLY, 0);
    }
    const posix_spawn_file_actions_t* get() const { return &actions_; }

private:
    posix_spawn_file_actions_t actions_{};
};

/// Out of the way of the three standard descriptors, of which one may be free.
int moveUp(hosttools::Descriptor& end) {
    if (end.get() > STDERR_FILENO) {
        return 0;
    }
    hosttools::Descriptor higher(fcntl(end.get(), F_DUPFD_CLOEXEC, STDERR_FILENO + 1));
    if (!higher.isOpen()) {
        return errno;
    }
    end = std::move(higher);
    return 0;
}

int makePipe(hosttools::Descriptor& reading, hosttools::Descriptor& writing) {
    std::array<int, 2> ends{};
    if (pipe2(ends.data(), O_CLOEXEC) != 0) {
        return errno;
    }
    reading = hosttools::Descriptor(ends[0]);
    writing = hosttools::Descriptor(ends[1]);
    const int error = moveUp(reading);
    return error != 0 ? error : moveUp(writing);
}

}  // namespace

int Child::start(const ProcessStart& start, int output) {
    Actions actions;
    if (const int error = actions.setUp(output, start.silent); error != 0) {
        return error;
    }
    std::vector<std::string> texts = start.words;
    std::vector<char*> words;
    std::ranges::transform(texts, std::back_inserter(words), [](std::string& text) { return text.data(); });
    words.push_back(nullptr);
    running_ = std::make_shared<RunningProcess>(start.command);
    // By the calling thread itself: the kernel lists a thread's children, and whoever ends commands looks
    // there.
    const Start gate;
    const std::size_t notes = processes().notes();
    pid_t process = -1;
    const int error =
        posix_spawn(&process, start.path.c_str(), actions.get(), nullptr, words.data(), environ);
    if (error == 0) {
        process_ = process;
        processes().add(process_, running_, notes);
    }
    return error;
}

Child::End Child::wait() {
    if (process_ < 0) {
        return end_;
    }
    int status = 0;
    pid_t waited = 0;
    do {
        waited = waitpid(process_, &status, 0);
    } while (waited < 0 && errno == EINTR);
    processes().remove(std::exchange(process_, -1), running_);
    holdWhenStopped();
    if (waited < 0) {
        return end_;  // somebody else has waited for it
    }
    const bool signalled = WIFSIGNALED(status);
    end_.status = signalled ? kSignalStatus + WTERMSIG(status) : WEXITSTATUS(status);
    end_.forced = running_->cutOff || (running_->forced && signalled && WTERMSIG(status) == SIGKILL);
    return end_;
}

void Child::setOutput(int output) {
    if (running_ != nullptr) {
        const std::lock_guard lock(running_->guard);
        running_->output = output;
    }
}

std::string commandOf(pid_t process) {
    const auto running = processes().find(process);
    return running != nullptr ? running->command : "";
}

std::vector<pid_t> readBy(pid_t thread) {
    return processes().readBy(thread);
}

bool cutOff(pid_t process) {
    const auto running = processes().find(process);
    if (running == nullptr) {
        return false;
    }
    const std::lock_guard lock(running->guard);
    if (running->output < 0) {
        return false;
    }
    const bool before = running->cutOff.exchange(true);
    wakeReader(running->output);  // each time: there may have been no descriptor for it
    return !before && !running->forced;
}

void noteKill(pid_t process) {
    processes().noteKill(process);
}

int ProcessSource::start(const ProcessStart& start) {
    hosttools::Descriptor writing;
    int error = makePipe(output_, writing);
    error = error != 0 ? error : child_.start(start, writing.get());
    if (error == 0) {
        child_.setOutput(output_.get());
    }
    return error;
}

int ProcessSource::startInto(const ProcessStart& start, int output) {
    return child_.start(start, output);
}

/// @return how much has come; nothing at the end, and of what is cut off
ssize_t ProcessSource::readOutput(char* buffer) {
    ssize_t got = -1;
    do {
        got = child_.isCutOff() ? 0 : read(output_.get(), buffer, kChunk);
    } while (got < 0 && errno == EINTR);
    return child_.isCutOff() ? 0 : got;
}

bool ProcessSource::pull(std::string& out) {
    if (!output_.isOpen()) {
        return false;
    }
    const std::size_t before = out.size();
    out.resize(before + kChunk);
    const ssize_t got = readOutput(out.data() + before);
    out.resize(before + (got > 0 ? static_cast<std::size_t>(got) : 0));
    return got > 0;
}

Child::End ProcessSource::finish() {
    child_.setOutput(-1);
    output_.reset();
    end_ = child_.wait();
    return end_;
}

}  // namespace cvagent::shell
