#pragma once

#include <cstdint>
#include <memory>
#include <vector>

#include "agent/core/event_keeper.h"

namespace cvagent {

/// What keeps the events of an agent of this process; null in a program that is built without a history. A
/// history is opened for the first event. That it cannot be is told once, and costs nothing else.
std::shared_ptr<EventKeeper> eventKeeper();

/// What this user has been shown of the events that were kept.
class ShownMarks {
public:
    struct Unseen {
        std::vector<Event> events;  ///< the last of them, the oldest first
        std::uint64_t left = 0;     ///< how many came before these
    };

    virtual ~ShownMarks() = default;
    virtual Unseen unseen() = 0;
    /// Everything up to this number was shown.
    virtual void shown(std::uint64_t number) = 0;
};

/// Those of this user in his agents' history; null in a program that is built without one. Where nothing was
/// kept so far, nothing is unseen.
std::shared_ptr<ShownMarks> shownMarks();

}  // namespace cvagent
