// popen, pclose and system as a plug-in finds them that this program has loaded: the loader looks in the
// program first. They do what the C library's do, and besides: they do without a shell where that is safe,
// they end with a stop, and they know of commands that could not be started. A stream that is read has no
// descriptor of its own.
#include <dlfcn.h>
#include <spawn.h>
#include <sys/wait.h>
#include <unistd.h>

#include <array>
#include <cerrno>
#include <cstdio>
#include <cstdlib>
#include <string>
#include <string_view>

#include "agent/shell/runner.h"
#include "agent/shell/starts.h"

#define CVAGENT_EXPORT extern "C" __attribute__((visibility("default")))

namespace {

using cvagent::shell::countBegun;
using cvagent::shell::countEnded;
using cvagent::shell::countNotStarted;
using cvagent::shell::Start;

template <class Function>
Function inLibrary(const char* name) {
    return reinterpret_cast<Function>(dlsym(RTLD_NEXT, name));
}

/// The reader's end of a pipe is not for programs that others start meanwhile: a pipe with two readers does
/// not end its writer when the one that reads goes.
std::string closingOnExec(const char* mode) {
    const std::string text = mode;
    return text.find('e') == std::string::npos ? text + 'e' : text;
}

int waitFor(pid_t process) {
    int status = -1;
    while (waitpid(process, &status, 0) < 0) {
        if (errno != EINTR) {
            return -1;
        }
    }
    return status;
}

FILE* opened(const char* command, const char* mode) {
    static const auto original = inLibrary<FILE* (*)(const char*, const char*)>("popen");
    if (const std::string_view wanted = mode; wanted == "r" || wanted == "re") {
        const auto direct = cvagent::shell::openCommand(command);
        return direct ? *direct : cvagent::shell::openInShell(command);
    }
    const Start start;
    FILE* const pipe = original(command, closingOnExec(mode).c_str());
    if (pipe == nullptr) {
        countNotStarted(errno);
    }
    return pipe;
}

/// Runs a shell to its end. Not by the C library: that one has the whole program ignore SIGINT meanwhile.
int ranByShell(const char* command) {
    std::array<char*, 4> words{const_cast<char*>("sh"), const_cast<char*>("-c"), const_cast<char*>(command),
                               nullptr};
    pid_t process = -1;
    {
        const Start start;
        const int error = posix_spawn(&process, "/bin/sh", nullptr, nullptr, words.data(), environ);
        if (error != 0) {
            countNotStarted(error);
            errno = error;
            return -1;
        }
    }
    const int status = waitFor(process);
    cvagent::shell::holdWhenStopped();
    return status;
}

}  // namespace

CVAGENT_EXPORT FILE* popen(const char* command, const char* mode) {
    countBegun();
    cvagent::shell::tellCommand(command);
    FILE* const pipe = opened(command, mode);
    if (pipe == nullptr) {
        countEnded();
    }
    return pipe;
}

CVAGENT_EXPORT int pclose(FILE* pipe) {
    static const auto original = inLibrary<int (*)(FILE*)>("pclose");
    if (const auto status = cvagent::shell::closeCommand(pipe)) {
        countEnded();
        return *status;
    }
    const int status = original(pipe);
    cvagent::shell::holdWhenStopped();
    countEnded();
    return status;
}

CVAGENT_EXPORT int system(const char* command) {
    if (command == nullptr) {
        return 1;  // there is a shell
    }
    countBegun();
    cvagent::shell::tellCommand(command);
    const auto direct = cvagent::shell::runCommand(command);
    const int status = direct ? *direct : ranByShell(command);
    countEnded();
    return status;
}
