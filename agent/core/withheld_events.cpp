#include "agent/core/withheld_events.h"

namespace cvagent {

void WithheldEvents::hear(const Event& event) {
    if (listener_ == nullptr) {
        return;
    }
    {
        const std::lock_guard lock(guard_);
        if (!released_) {
            kept_.push_back(event);
            return;
        }
    }
    listener_->hear(event);
}

/// Under the lock, so that nothing that comes meanwhile overtakes what was kept.
void WithheldEvents::release() {
    const std::lock_guard lock(guard_);
    for (const Event& event : kept_) {
        listener_->hear(event);
    }
    kept_.clear();
    released_ = true;
}

}  // namespace cvagent
