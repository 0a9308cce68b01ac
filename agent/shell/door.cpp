// popen, pclose and system as a plug-in finds them that this program has loaded: the loader looks in the
// program first. They do what the C library's do, and besides: they do without a shell where that is safe,
// they end with a stop, and they know of commands that could not be started.
#include <dlfcn.h>
#include <spawn.h>
#include <sys/wait.h>
#include <unistd.h>

#include <array>
#include <cerrno>
#include <cstdio>
#include <cstdlib>
#include <cstring>

#include "agent/shell/runner.h"
#include "agent/shell/starts.h"

#define CVAGENT_DOOR extern "C" __attribute__((visibility("default")))

namespace {

using cvagent::shell::countNotStarted;
using cvagent::shell::Start;

template <class Function>
Function inLibrary(const char* name) {
    return reinterpret_cast<Function>(dlsym(RTLD_NEXT, name));
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

}  // namespace

CVAGENT_DOOR FILE* popen(const char* command, const char* mode) {
    static const auto original = inLibrary<FILE* (*)(const char*, const char*)>("popen");
    if (std::strcmp(mode, "r") == 0) {
        if (const auto direct = cvagent::shell::openCommand(command)) {
            return *direct;
        }
    }
    const Start start;
    FILE* const pipe = original(command, mode);
    if (pipe == nullptr) {
        countNotStarted(errno);
    }
    return pipe;
}

CVAGENT_DOOR int pclose(FILE* pipe) {
    static const auto original = inLibrary<int (*)(FILE*)>("pclose");
    if (const auto status = cvagent::shell::closeCommand(pipe)) {
        return *status;
    }
    const int status = original(pipe);
    cvagent::shell::holdWhenStopped();
    return status;
}

// Not the C library's: that one has the whole program ignore SIGINT for as long as the command runs.
CVAGENT_DOOR int system(const char* command) {
    if (command == nullptr) {
        return 1;  // there is a shell
    }
    if (const auto status = cvagent::shell::runCommand(command)) {
        return *status;
    }
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
