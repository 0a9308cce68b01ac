#include "agent/core/signals.h"

#include <fcntl.h>
#include <unistd.h>

#include <array>
#include <cerrno>
#include <csignal>
#include <cstdlib>

namespace cvagent {

namespace {

volatile std::sig_atomic_t receivedSignal = 0;
std::array<int, 2> wakeUp{-1, -1};

void remember(int signal) {
    const int savedErrno = errno;
    receivedSignal = signal;
    [[maybe_unused]] const ssize_t written = write(wakeUp[1], "", 1);  // a full pipe is readable already
    errno = savedErrno;
}

void passOver(int /*signal*/) {}

void handle(int signal, void (*handler)(int)) {
    struct sigaction action {};
    action.sa_handler = handler;
    action.sa_flags = SA_RESTART;
    sigemptyset(&action.sa_mask);
    sigaction(signal, &action, nullptr);
}

}  // namespace

void StopSignals::install() {
    if (wakeUp[0] >= 0) {
        return;
    }
    if (pipe2(wakeUp.data(), O_CLOEXEC | O_NONBLOCK) != 0) {
        return;  // the process has no descriptors left: signals keep ending it at once
    }
    for (const int signal : {SIGINT, SIGTERM, SIGHUP}) {
        handle(signal, remember);
    }
    handle(SIGPIPE, passOver);
}

int StopSignals::received() {
    return receivedSignal;
}

int StopSignals::descriptor() {
    return wakeUp[0];
}

void StopSignals::die() {
    const int signal = received();
    handle(signal, SIG_DFL);
    kill(getpid(), signal);
    std::_Exit(128 + signal);
}

}  // namespace cvagent
