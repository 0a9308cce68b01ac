#include "plugins/hardware/quiet_thread.h"

#include <csignal>
#include <memory>
#include <utility>

namespace hardware {

std::thread quietThread(std::function<void()> work) {
    sigset_t all;
    sigset_t before;
    sigfillset(&all);
    pthread_sigmask(SIG_BLOCK, &all, &before);
    const auto restore = [&before](const sigset_t* /*all*/) {
        pthread_sigmask(SIG_SETMASK, &before, nullptr);
    };
    const std::unique_ptr<const sigset_t, decltype(restore)> atTheEnd(&all, restore);
    return std::thread(std::move(work));
}

}  // namespace hardware
