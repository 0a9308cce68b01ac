#include "agent/service/late_readings.h"

#include <algorithm>
#include <utility>

namespace cvagent::service {

void LateReadings::beginLook(Clock::time_point now) {
    isDue_ = due_ && *due_ <= now;
}

LateReadings::Properties LateReadings::of(std::uint32_t node) const {
    const auto found = late_.find(node);
    return isDue_ && found != late_.end() ? found->second : Properties();
}

void LateReadings::endLook(const Look& look, Clock::time_point now) {
    constexpr std::chrono::seconds kLongestPause{600};
    const auto before = std::exchange(late_, {});
    for (const std::uint32_t node : look.order) {
        if (const auto found = before.find(node); found != before.end()) {
            late_.insert(*found);
        }
    }
    for (const NodeView& view : look.nodes) {
        Properties& late = late_[view.id];
        std::erase_if(late, [&view](unsigned int property) {
            return view.asked.empty() || std::ranges::binary_search(view.asked, property);
        });
        for (const Reading& reading : view.readings) {
            if (reading.timedOut) {
                late.insert(reading.id);
            }
        }
    }
    std::erase_if(late_, [](const auto& entry) { return entry.second.empty(); });
    if (late_.empty()) {
        due_.reset();
        pause_ = kFirstPause;
    } else if (isDue_ || !due_) {
        due_ = now + pause_;
        pause_ = std::min(2 * pause_, kLongestPause);
    }
}

}  // namespace cvagent::service
