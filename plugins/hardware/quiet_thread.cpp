#include "plugins/hardware/quiet_thread.h"

#include <csignal>
#include <utility>

namespace hardware {

namespace {

/// Keeps all signals from the calling thread, and from the threads that it starts, as long as this lives.
class SignalsBlocked {
public:
    SignalsBlocked() {
        sigset_t all;
        sigfillset(&all);
        pthread_sigmask(SIG_BLOCK, &all, &before_);
    }
    SignalsBlocked(const SignalsBlocked&) = delete;
    SignalsBlocked& operator=(const SignalsBlocked&) = delete;
    ~SignalsBlocked() { pthread_sigmask(SIG_SETMASK, &before_, nullptr); }

private:
    sigset_t before_{};
};

}  // namespace

std::thread quietThread(std::function<void()> work) {
    const SignalsBlocked blocked;
    return std::thread(std::move(work));
}

}  // namespace hardware
