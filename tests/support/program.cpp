#include "tests/support/program.h"

#include <fcntl.h>
#include <poll.h>
#include <spawn.h>
#include <sys/syscall.h>
#include <sys/wait.h>
#include <unistd.h>

#include <algorithm>
#include <csignal>
#include <cstdlib>
#include <stdexcept>
#include <thread>

#include "tests/support/fake_host.h"
#include "tests/support/files.h"
#include "tests/support/system_call.h"

using namespace std::chrono;

namespace {

// The clock recorder goes into programs of this build only: the machine's may be of another word size. The
// address sanitizer wants to be the first library loaded, but the recorder has to be.
std::vector<std::string> surroundings(const std::string& program) {
    std::vector<std::string> variables;
    std::string options = "verify_asan_link_order=0";
    for (char** at = environ; *at; ++at) {
        std::string variable = *at;
        if (variable.rfind("LD_PRELOAD=", 0) == 0) continue;
        if (variable.rfind("ASAN_OPTIONS=", 0) == 0)
            options = variable.substr(13) + ":" + options;
        else
            variables.push_back(variable);
    }
    variables.push_back("ASAN_OPTIONS=" + options);
    if (program.rfind(buildDirectory(), 0) == 0)
        variables.push_back("LD_PRELOAD=" + buildDirectory() + "/fakehost/libclockrecorder.so");
    return variables;
}

std::vector<char*> pointers(std::vector<std::string>& texts) {
    std::vector<char*> list;
    for (std::string& text : texts) list.push_back(text.data());
    list.push_back(nullptr);
    return list;
}

pid_t spawn(std::vector<std::string> words, const std::string& prefix) {
    posix_spawn_file_actions_t actions;
    posix_spawn_file_actions_init(&actions);
    constexpr int created = O_WRONLY | O_CREAT | O_TRUNC | O_APPEND;
    posix_spawn_file_actions_addopen(&actions, STDOUT_FILENO, (prefix + ".out").c_str(), created, 0644);
    posix_spawn_file_actions_addopen(&actions, STDERR_FILENO, (prefix + ".err").c_str(), created, 0644);
    std::vector<std::string> variables = surroundings(words.front());
    pid_t child = -1;
    int error = posix_spawnp(&child, words.front().c_str(), &actions, nullptr, pointers(words).data(),
                             pointers(variables).data());
    posix_spawn_file_actions_destroy(&actions);
    if (error != 0) throw std::system_error(error, std::generic_category(), "start " + words.front());
    return child;
}

}  // namespace

RunningProgram::RunningProgram(const std::vector<std::string>& words, const std::string& outputPrefix)
    : prefix_(outputPrefix),
      pid_(spawn(words, outputPrefix)),
      handle_(static_cast<int>(fake_host::must(syscall(SYS_pidfd_open, pid_, 0), "watch " + words.front()))) {
}

RunningProgram::~RunningProgram() {
    if (pid_ > 0) {
        kill(pid_, SIGKILL);
        waitpid(pid_, nullptr, 0);
    }
    close(handle_);
}

void RunningProgram::signal(int number) const {
    fake_host::must(kill(pid_, number), "send a signal");
}

std::string RunningProgram::out() const {
    return fake_host::readFile(prefix_ + ".out").value_or("");
}

std::string RunningProgram::err() const {
    return fake_host::readFile(prefix_ + ".err").value_or("");
}

bool RunningProgram::endsWithin(milliseconds time) const {
    pollfd ended{handle_, POLLIN, 0};
    return poll(&ended, 1, static_cast<int>(std::max<milliseconds::rep>(time.count(), 0))) > 0;
}

bool RunningProgram::waitForOutput(const std::string& text, seconds limit) const {
    const auto end = steady_clock::now() + limit;
    for (bool over = false;;) {
        if (out().find(text) != std::string::npos) return true;
        if (over || steady_clock::now() > end) return false;
        over = endsWithin(milliseconds(2));  // look once more at what it printed last
    }
}

Finished RunningProgram::wait(seconds limit) {
    if (!endsWithin(limit))
        throw std::runtime_error("the program is still running; it printed: " + out() + err());
    int status = 0;
    fake_host::must(waitpid(pid_, &status, 0), "wait for the program");
    pid_ = -1;
    return {WIFEXITED(status) ? WEXITSTATUS(status) : 128 + WTERMSIG(status), out(), err()};
}
