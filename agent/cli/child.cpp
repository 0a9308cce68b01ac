#include "agent/cli/child.h"

#include <fcntl.h>
#include <poll.h>
#include <spawn.h>
#include <sys/wait.h>
#include <unistd.h>

#include <array>
#include <cerrno>
#include <chrono>
#include <csignal>
#include <thread>

#include "agent/shell/starts.h"
#include "framework/qx/process_tree.h"

namespace cvagent {

namespace {

constexpr std::chrono::milliseconds kLook{10};
// What dies at all dies sooner; and a signal to stop leaves 0.6 s for everything.
constexpr std::chrono::milliseconds kToDie{300};

/// Every signal at its default and none blocked: what the agent was started with is not for others. A session
/// of its own: Ctrl-C is for the agent.
void setUp(posix_spawnattr_t& attributes) {
    sigset_t none;
    sigset_t all;
    sigemptyset(&none);
    sigfillset(&all);
    posix_spawnattr_setsigmask(&attributes, &none);
    posix_spawnattr_setsigdefault(&attributes, &all);
    posix_spawnattr_setflags(&attributes,
                             POSIX_SPAWN_SETSIGMASK | POSIX_SPAWN_SETSIGDEF | POSIX_SPAWN_SETSID);
}

}  // namespace

Child::Child(const std::string& program, int output) {
    std::array<int, 2> ends{-1, -1};
    if (pipe2(ends.data(), O_CLOEXEC) != 0) {
        error_ = errno;
        return;
    }
    fcntl(ends[1], F_SETFL, O_NONBLOCK);
    spawn(program, ends[0], output);
    close(ends[0]);
    input_ = ends[1];
}

void Child::spawn(const std::string& program, int input, int output) {
    posix_spawn_file_actions_t actions;
    posix_spawn_file_actions_init(&actions);
    posix_spawn_file_actions_adddup2(&actions, input, STDIN_FILENO);
    posix_spawn_file_actions_adddup2(&actions, output, STDOUT_FILENO);
    posix_spawn_file_actions_adddup2(&actions, STDOUT_FILENO, STDERR_FILENO);
    posix_spawn_file_actions_addclosefrom_np(&actions, STDERR_FILENO + 1);
    posix_spawn_file_actions_addchdir_np(&actions, "/");
    posix_spawnattr_t attributes;
    posix_spawnattr_init(&attributes);
    setUp(attributes);
    std::string name = program;
    std::array<char*, 2> words{name.data(), nullptr};
    const shell::Start start;
    error_ = posix_spawn(&process_, program.c_str(), &actions, &attributes, words.data(), environ);
    posix_spawnattr_destroy(&attributes);
    posix_spawn_file_actions_destroy(&actions);
}

Child::~Child() {
    if (input_ >= 0) {
        close(input_);
    }
    if (error_ == 0 && process_ > 0) {
        if (!hasEnded()) {
            kill();
            if (!isLeft_) {
                endsInTime();
            }
        }
        waitpid(process_, nullptr, WNOHANG);
    }
}

void Child::feed(const std::string& text, const std::function<bool()>& isOver) {
    for (std::size_t done = 0; done < text.size() && !isOver() && !hasEnded();) {
        const ssize_t size = write(input_, text.data() + done, text.size() - done);
        if (size > 0) {
            done += static_cast<std::size_t>(size);
        } else if (errno == EAGAIN) {
            pollfd room{input_, POLLOUT, 0};
            poll(&room, 1, static_cast<int>(kLook.count()));
        } else if (errno != EINTR) {
            break;  // it does not read it, and need not
        }
    }
    close(input_);
    input_ = -1;
}

/// The process stays as it is, so that its number is not given out again.
bool Child::hasEnded() const {
    siginfo_t ended{};
    return waitid(P_PID, static_cast<id_t>(process_), &ended, WEXITED | WNOHANG | WNOWAIT) != 0 ||
           ended.si_pid == process_;
}

void Child::kill() const {
    for (const QX::ChildProcess& child : QX::childrenOf(gettid())) {
        if (child.id == process_) {
            QX::killChild(gettid(), child);
        }
    }
    ::kill(-process_, SIGKILL);  // what has lost its parent but not its session
}

/// After a kill.
bool Child::endsInTime() const {
    for (const auto end = std::chrono::steady_clock::now() + kToDie; !hasEnded();) {
        if (std::chrono::steady_clock::now() >= end) {
            return false;
        }
        std::this_thread::sleep_for(kLook);
    }
    return true;
}

Child::End Child::wait(const std::function<bool()>& isOver) {
    End end = End::byItself;
    while (end == End::byItself && !hasEnded()) {
        if (isOver()) {
            kill();
            end = End::killed;
        } else {
            std::this_thread::sleep_for(kLook);
        }
    }
    if (end == End::killed && !endsInTime()) {
        isLeft_ = true;
        return End::unkillable;
    }
    while (waitpid(process_, &status_, 0) < 0 && errno == EINTR) {
    }
    process_ = -1;
    return end;
}

std::string Child::complaint() const {
    if (WIFSIGNALED(status_)) {
        return "was ended by signal " + std::to_string(WTERMSIG(status_));
    }
    return WEXITSTATUS(status_) == 0 ? "" : "failed with status " + std::to_string(WEXITSTATUS(status_));
}

}  // namespace cvagent
