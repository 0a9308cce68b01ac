#include "agent/core/withheld_events.h"

namespace cvagent {

void WithheldEvents::hear(const Event& event) {
    if (listener_ == nullptr) {
        return;
    }
    if (!isKept(event)) {
        listener_->hear(event);
    }
}

bool WithheldEvents::isKept(const Event& event) {
    std::unique_lock lock(guard_);
    if (event.kind == Event::Kind::alert && std::this_thread::get_id() != starter_) {
        decided_.wait_for(lock, kLongestWait, [this] { return released_ || abandoned_; });
    }
    if (!released_ && !abandoned_) {
        kept_.push_back(event);
    }
    return !released_;
}

void WithheldEvents::startHere() {
    const std::lock_guard lock(guard_);
    starter_ = std::this_thread::get_id();
}

/// Under the lock, so that nothing that comes meanwhile overtakes what was kept.
void WithheldEvents::release() {
    const std::lock_guard lock(guard_);
    for (const Event& event : kept_) {
        listener_->hear(event);
    }
    kept_.clear();
    released_ = true;
    decided_.notify_all();
}

void WithheldEvents::abandon() {
    const std::lock_guard lock(guard_);
    abandoned_ = true;
    kept_.clear();
    decided_.notify_all();
}

}  // namespace cvagent
