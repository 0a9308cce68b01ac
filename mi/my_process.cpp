#include "mi/my_process.h"

#include <sys/wait.h>

#include <csignal>

#include "framework/qx/thread.h"
#include "mi/log.h"

namespace IC {

namespace {

thread_local unsigned int cutOff = 0;

/// A shell tells of a tool's death by a signal with a status above 128.
int signalOf(int status) {
    constexpr int kSignalStatus = 128;
    if (WIFSIGNALED(status)) {
        return WTERMSIG(status);
    }
    const int exited = WIFEXITED(status) ? WEXITSTATUS(status) - kSignalStatus : 0;
    return exited > 0 && exited < NSIG ? exited : 0;
}

}  // namespace

FILE* openPipe(const char* command, const char* mode) {
    if (QX::Thread::isAborted()) {
        ++cutOff;
        return nullptr;
    }
    return popen(command, mode);
}

void closePipe(FILE* pipe) {
    const int status = pipe != nullptr ? pclose(pipe) : 0;
    const int signal = status == -1 ? 0 : signalOf(status);
    if (signal != 0 && signal != SIGPIPE) {
        ++cutOff;
    }
}

unsigned int commandsCutOff() {
    return cutOff;
}

MyProcess::MyProcess() : pipe_(nullptr) {}

MyProcess::~MyProcess() {
    if (pipe_ != nullptr) {
        closePipe(pipe_);
        --cnt;
    }
}

FILE* MyProcess::mypopen(const char* command, const char* mode) {
    pipe_ = openPipe(command, mode);
    ++cnt;
    return pipe_;
}

FILE* MyProcess::mypopen(std::string command, const char* mode) {
    mypopen(command.c_str(), mode);
    log(kProgress) << "mypopen():  Count value " << cnt.load();
    return pipe_;
}

}  // namespace IC
