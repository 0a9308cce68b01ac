#include "framework/qx/event.h"

#include "framework/qx/clock.h"
#include "framework/qx/interruption.h"

namespace QX {

Event::Event(bool autoReset) : autoReset_(autoReset) {}
Event::~Event() = default;

void Event::signal() {
    // Under the lock: a waiter may destroy the event as soon as it has seen the signal.
    const std::lock_guard lock(guard_);
    signalled_ = true;
    changed_.notify_all();
}

bool Event::wait(unsigned long seconds) {
    const auto longest = scaled(std::chrono::duration<double>(seconds));
    const AbortableWait abortable(guard_, changed_);
    std::unique_lock lock(guard_);
    changed_.wait_for(lock, longest, [&] { return signalled_ || abortable.aborted(); });
    const bool signalled = signalled_;
    if (autoReset_) {
        signalled_ = false;
    }
    return signalled;
}

}  // namespace QX
