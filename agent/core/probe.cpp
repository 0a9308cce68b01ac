#include "agent/core/probe.h"

#include <fcntl.h>
#include <poll.h>
#include <spawn.h>
#include <sys/wait.h>
#include <unistd.h>

#include <algorithm>
#include <array>
#include <cerrno>
#include <csignal>
#include <utility>

#include "agent/core/want.h"
#include "agent/shell/starts.h"

namespace cvagent {

namespace {

constexpr std::size_t kMostOutput = 1U << 20U;  // a listing of a thousand disks is a tenth of that

pid_t spawn(std::vector<std::string>& words, int output) {
    std::vector<char*> arguments;
    arguments.reserve(words.size() + 1);
    for (std::string& word : words) {
        arguments.push_back(word.data());
    }
    arguments.push_back(nullptr);
    posix_spawn_file_actions_t actions;
    posix_spawn_file_actions_init(&actions);
    posix_spawn_file_actions_addopen(&actions, STDIN_FILENO, "/dev/null", O_RDONLY, 0);
    posix_spawn_file_actions_adddup2(&actions, output, STDOUT_FILENO);
    posix_spawn_file_actions_addopen(&actions, STDERR_FILENO, "/dev/null", O_WRONLY, 0);
    pid_t process = -1;
    const shell::Start start;
    const int error =
        posix_spawn(&process, words.front().c_str(), &actions, nullptr, arguments.data(), environ);
    posix_spawn_file_actions_destroy(&actions);
    noteWant(error);
    return error == 0 ? process : -1;
}

}  // namespace

Probe::Probe(std::vector<std::string> words) {
    std::array<int, 2> ends{-1, -1};
    if (pipe2(ends.data(), O_CLOEXEC) != 0) {
        noteWant(errno);
        return;
    }
    pipe_ = ends[0];
    process_ = spawn(words, ends[1]);
    close(ends[1]);
}

Probe::Probe(Probe&& other) noexcept
    : process_(std::exchange(other.process_, -1)),
      pipe_(std::exchange(other.pipe_, -1)),
      output_(std::move(other.output_)) {}

Probe::~Probe() {
    if (process_ > 0) {
        kill(process_, SIGKILL);
        collect();
    }
    if (pipe_ >= 0) {
        close(pipe_);
    }
}

bool Probe::finish(std::chrono::milliseconds longest) {
    using Clock = std::chrono::steady_clock;
    const auto end = Clock::now() + longest;
    std::array<char, 4096> part{};
    while (process_ > 0) {
        const auto left = std::chrono::duration_cast<std::chrono::milliseconds>(end - Clock::now()).count();
        pollfd ready{pipe_, POLLIN, 0};
        const int result = poll(&ready, 1, static_cast<int>(std::max<long long>(0, left)));
        if (result < 0 && errno == EINTR) {
            continue;
        }
        const ssize_t size = result > 0 ? read(pipe_, part.data(), part.size()) : -1;
        if (size <= 0) {
            if (size < 0) {
                kill(process_, SIGKILL);  // out of time
            }
            break;
        }
        if (output_.size() < kMostOutput) {  // the rest is read, too, or the program would wait for ever
            output_.append(part.data(), static_cast<std::size_t>(size));
        }
    }
    return process_ > 0 && collect() == 0;
}

int Probe::collect() {
    int status = -1;
    while (waitpid(process_, &status, 0) < 0 && errno == EINTR) {
    }
    process_ = -1;
    return status;
}

}  // namespace cvagent
