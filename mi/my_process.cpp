#include "mi/my_process.h"

#include "mi/log.h"

namespace IC {

MyProcess::MyProcess() : pipe_(nullptr) {}

MyProcess::~MyProcess() {
    if (pipe_ != nullptr) {
        pclose(pipe_);
        --cnt;
    }
}

FILE* MyProcess::mypopen(const char* command, const char* mode) {
    pipe_ = popen(command, mode);
    ++cnt;
    return pipe_;
}

FILE* MyProcess::mypopen(std::string command, const char* mode) {
    mypopen(command.c_str(), mode);
    log(kProgress) << "mypopen():  Count value " << cnt.load();
    return pipe_;
}

}  // namespace IC
