#pragma once

#include <mutex>
#include <string>
#include <vector>

#include "agent/change/plan.h"

namespace cvagent::change {

/// What is done while changes are tried, in its order. Any thread.
class Record {
public:
    /// The one of this process.
    static Record& only();

    /// From here on it belongs to that change.
    void begin(std::size_t change);
    /// A command of the plug-in; counts while it writes.
    void command(const std::string& text, bool recorded);
    std::vector<PlannedCommand> commands() const;

private:
    mutable std::mutex guard_;
    std::size_t change_ = 0;                // guarded by guard_
    std::vector<PlannedCommand> commands_;  // guarded by guard_
};

}  // namespace cvagent::change
