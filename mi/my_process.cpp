#include "mi/my_process.h"

#include <sys/wait.h>

#include <csignal>

#include "framework/qx/thread.h"
#include "mi/log.h"

namespace IC {

namespace {

thread_local unsigned int cutOff = 0;

}  // namespace

FILE* openPipe(const char* command, const char* mode) {
    if (QX::Thread::isAborted()) {
        ++cutOff;
        return nullptr;
    }
    return command != nullptr ? popen(command, mode) : nullptr;
}

void closePipe(FILE* pipe) {
    const int status = pipe != nullptr ? pclose(pipe) : 0;
    // Nothing else is asked of a status: a shell passes on that of its last tool, and tools exit with any
    // number, those that stand for signals among them.
    if (status != -1 && WIFSIGNALED(status) && WTERMSIG(status) == SIGKILL) {
        ++cutOff;
    }
}

unsigned int commandsCutOff() {
    return cutOff;
}

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
    const Operation operation;
    mypopen(command.c_str(), mode);
    logOpenPipes();
    return pipe_;
}

void MyProcess::logOpenPipes() {
    log(kProgress, "mypopen") << "mypopen():  Count value " << cnt.load();
}

}  // namespace IC
