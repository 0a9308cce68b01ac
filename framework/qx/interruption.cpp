#include "framework/qx/interruption.h"

namespace QX {
namespace {

thread_local Interruption* current = nullptr;

}  // namespace

Interruption* Interruption::ofThisThread() {
    return current;
}

void Interruption::setForThisThread(Interruption* interruption) {
    current = interruption;
}

void Interruption::endSleeps() {
    const std::lock_guard lock(guard_);
    sleepsEnd_ = true;
    changed_.notify_all();
}

void Interruption::abort() {
    const std::lock_guard lock(guard_);
    sleepsEnd_ = true;
    aborted_ = true;
    changed_.notify_all();
    if (waitGuard_ != nullptr) {
        // Once the guard was free the waiter has seen the flag or is asleep and hears the call.
        waitGuard_->lock();
        waitGuard_->unlock();
        waitChanged_->notify_all();
    }
}

void Interruption::reset() {
    const std::lock_guard lock(guard_);
    sleepsEnd_ = false;
    aborted_ = false;
    left_ = false;
}

void Interruption::sleep(std::chrono::nanoseconds duration) {
    std::unique_lock lock(guard_);
    changed_.wait_for(lock, duration, [this] { return sleepsEnd_; });
}

void Interruption::setWait(std::mutex* guard, std::condition_variable* changed) {
    const std::lock_guard lock(guard_);
    waitGuard_ = guard;
    waitChanged_ = changed;
}

AbortableWait::AbortableWait(std::mutex& guard, std::condition_variable& changed)
    : interruption_(Interruption::ofThisThread()) {
    if (interruption_ != nullptr) {
        interruption_->setWait(&guard, &changed);
    }
}

AbortableWait::~AbortableWait() {
    if (interruption_ != nullptr) {
        interruption_->setWait(nullptr, nullptr);
    }
}

}  // namespace QX
