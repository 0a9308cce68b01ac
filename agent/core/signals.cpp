#include "agent/core/signals.h"

#include <fcntl.h>
#include <semaphore.h>
#include <sys/prctl.h>
#include <sys/time.h>
#include <unistd.h>

#include <array>
#include <atomic>
#include <cerrno>
#include <chrono>
#include <csignal>
#include <cstdlib>
#include <exception>
#include <system_error>
#include <thread>

#include "agent/core/environment.h"
#include "agent/core/threads.h"
#include "agent/shell/starts.h"
#include "framework/qx/process_tree.h"

namespace cvagent {

namespace {

using Clock = std::chrono::steady_clock;
using namespace std::chrono_literals;

// Together less than the second after which whoever sent the signal may give up.
constexpr auto kOrder = 600ms;         // for an orderly end
constexpr auto kSearch = 150ms;        // for the commands that run; one that a device holds cannot be killed
constexpr suseconds_t kLast = 250000;  // microseconds until the program dies even if the search hangs

std::atomic<int> receivedSignal{0};
std::atomic<int> orderly{0};
std::array<int, 2> wakeUp{-1, -1};
sem_t arrived;

void handle(int signal, void (*handler)(int)) {
    struct sigaction action {};
    action.sa_handler = handler;
    action.sa_flags = SA_RESTART;
    sigemptyset(&action.sa_mask);
    sigaction(signal, &action, nullptr);
}

bool isIgnored(int signal) {
    struct sigaction action {};
    return sigaction(signal, nullptr, &action) == 0 && action.sa_handler == SIG_IGN;
}

void remember(int signal) {
    const int savedErrno = errno;
    int none = 0;
    if (receivedSignal.compare_exchange_strong(none, signal) && orderly == 0) {
        shell::declareStop();
    }
    // The same Ctrl-C kills shells: what those leave behind that die later is to be found among our children.
    prctl(PR_SET_CHILD_SUBREAPER, 1, 0, 0, 0);
    sem_post(&arrived);
    [[maybe_unused]] const ssize_t written = write(wakeUp[1], "", 1);  // a full pipe is readable already
    errno = savedErrno;
}

void passOver(int /*signal*/) {}

void dieAtLast(int /*signal*/) {
    StopSignals::die();
}

/// @return whether one was alive before
bool killCommands() {
    bool any = false;
    for (const pid_t thread : ownThreads()) {
        any = any || !commandsOf(thread).empty();
        QX::killChildrenOf(thread, childrenOfTheCaller());
    }
    // The same Ctrl-C has killed shells: a tool that it did not kill is nobody's child any more.
    return QX::killMarked(markOfCommands(), shell::busySince()) || any;
}

[[noreturn]] void endNow() {
    shell::declareStop();
    handle(SIGALRM, dieAtLast);
    const itimerval last{{0, 0}, {0, kLast}};
    setitimer(ITIMER_REAL, &last, nullptr);
    const auto end = Clock::now() + kSearch;
    try {
        bool more = true;
        do {  // once in any case: the time may be over for want of a processor
            const bool starting = shell::startsUnderWay() != 0;
            more = killCommands() || starting;
            std::this_thread::sleep_for(1ms);
        } while (more && Clock::now() < end);
    } catch (const std::exception&) {
        // No memory to look for them.
    }
    StopSignals::die();
}

void waitForSignal() {
    while (sem_wait(&arrived) != 0) {
    }
    for (const auto end = Clock::now() + kOrder; !shell::isStopped() && Clock::now() < end;) {
        std::this_thread::sleep_for(5ms);
    }
    endNow();
}

}  // namespace

void StopSignals::becomeWriteErrors() {
    handle(SIGPIPE, passOver);
    handle(SIGXFSZ, passOver);
}

void StopSignals::ignore() {
    for (const int each : {SIGINT, SIGTERM, SIGHUP, SIGQUIT, SIGTSTP, SIGTTOU}) {
        handle(each, SIG_IGN);
    }
}

void StopSignals::install() {
    becomeWriteErrors();
    sem_init(&arrived, 0, 0);
    try {
        std::thread(waitForSignal).detach();
    } catch (const std::system_error&) {
        return;
    }
    if (pipe2(wakeUp.data(), O_CLOEXEC | O_NONBLOCK) != 0) {
        wakeUp = {-1, -1};
    }
    for (const int signal : {SIGINT, SIGTERM, SIGHUP}) {
        if (signal != SIGHUP || !isIgnored(signal)) {  // as after nohup
            handle(signal, remember);
        }
    }
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

OrderlyEnd::OrderlyEnd() {
    ++orderly;
}

OrderlyEnd::~OrderlyEnd() {
    --orderly;
}

}  // namespace cvagent
