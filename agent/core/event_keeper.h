#pragma once

#include <vector>

#include "agent/core/event.h"

namespace cvagent {

/// Gives the events of an agent their numbers and keeps them beyond its process. One call at a time, on a
/// thread that may wait for a disk.
class EventKeeper {
public:
    virtual ~EventKeeper() = default;
    /// Numbers the events in their order; they are safe when it returns. What cannot be kept gets a number
    /// all the same. An alert that is kept already, since the process that told it was ended before the
    /// plug-in could take it for told, gets the number that it has.
    virtual void keep(std::vector<Event>& events) noexcept = 0;
    /// The plug-ins have taken for told what was kept so far.
    virtual void settle() noexcept = 0;
};

}  // namespace cvagent
