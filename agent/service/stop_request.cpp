#include "agent/service/stop_request.h"

#include <fcntl.h>
#include <unistd.h>

#include <cerrno>
#include <system_error>

namespace cvagent::service {

namespace {

std::array<int, 2> told{-1, -1};

void tellSignal(int signal) {
    const int savedErrno = errno;
    const auto byte = static_cast<unsigned char>(signal);
    [[maybe_unused]] const ssize_t written = write(told[1], &byte, 1);  // a full pipe holds enough of them
    errno = savedErrno;
}

}  // namespace

StopRequest::StopRequest() {
    if (pipe2(told.data(), O_CLOEXEC | O_NONBLOCK) != 0) {
        throw std::system_error(errno, std::generic_category(), "cannot wait for signals");
    }
    struct sigaction ours {};
    ours.sa_handler = tellSignal;
    ours.sa_flags = SA_RESTART;
    sigemptyset(&ours.sa_mask);
    for (std::size_t i = 0; i < kSignals.size(); ++i) {
        sigaction(kSignals.at(i), &ours, &before_.at(i));
    }
}

StopRequest::~StopRequest() {
    release();
}

int StopRequest::descriptor() const {
    return released_ ? -1 : told[0];
}

int StopRequest::take() {
    unsigned char byte = 0;
    return read(told[0], &byte, 1) == 1 ? byte : 0;
}

void StopRequest::release() {
    if (released_) {
        return;
    }
    released_ = true;
    for (std::size_t i = 0; i < kSignals.size(); ++i) {
        sigaction(kSignals.at(i), &before_.at(i), nullptr);
    }
}

}  // namespace cvagent::service
