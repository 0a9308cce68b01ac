// popen, pclose and system as a plug-in finds them that this program has loaded: the loader looks in the
// program first. They do what the C library's do, and besides two things: they end with a stop, and they know
// of commands that could not be started.
#include <dlfcn.h>
#include <spawn.h>
#include <sys/wait.h>
#include <unistd.h>

#include <array>
#include <cerrno>
#include <cstdio>
#include <cstdlib>
#include <string>

#include "agent/shell/starts.h"

#define CVAGENT_DOOR extern "C" __attribute__((visibility("default")))

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

}  // namespace

CVAGENT_DOOR FILE* popen(const char* command, const char* mode) {
    static const auto original = inLibrary<FILE* (*)(const char*, const char*)>("popen");
    const Start start;
    countBegun();
    FILE* const pipe = original(command, closingOnExec(mode).c_str());
    if (pipe == nullptr) {
        countNotStarted(errno);
        countEnded();
    }
    return pipe;
}

CVAGENT_DOOR int pclose(FILE* pipe) {
    static const auto original = inLibrary<int (*)(FILE*)>("pclose");
    const int status = original(pipe);
    cvagent::shell::holdWhenStopped();
    countEnded();
    return status;
}

// Not the C library's: that one has the whole program ignore SIGINT for as long as the command runs.
CVAGENT_DOOR int system(const char* command) {
    if (command == nullptr) {
        return 1;  // there is a shell
    }
    std::array<char*, 4> words{const_cast<char*>("sh"), const_cast<char*>("-c"), const_cast<char*>(command),
                               nullptr};
    pid_t process = -1;
    {
        const Start start;
        countBegun();
        const int error = posix_spawn(&process, "/bin/sh", nullptr, nullptr, words.data(), environ);
        if (error != 0) {
            countNotStarted(error);
            countEnded();
            errno = error;
            return -1;
        }
    }
    const int status = waitFor(process);
    cvagent::shell::holdWhenStopped();
    countEnded();
    return status;
}
