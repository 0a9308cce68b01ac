#pragma once

#include <map>
#include <mutex>
#include <optional>
#include <utility>

#include "agent/core/reading.h"

namespace cvagent {

/// What is known of the host, and since when. Any thread.
class Facts {
public:
    using Clock = std::chrono::steady_clock;

    /// A node is listed from now on; what it stores is as old as this.
    /// @return false when it was known before
    bool meet(unsigned int node);
    /// A node is listed no more.
    void forget(unsigned int node);

    /// Reads a property, on the calling thread, and judges what that brought.
    Reading ask(const IC::MutableNode& node, unsigned int id, Source source = Source::plugin);
    /// Takes over what a read brought. One that was cut off gets the last value, marked stale.
    /// @param begun when the read began; an older answer never replaces a younger one
    void judge(const IC::MutableNode& node, Reading& reading, Clock::time_point begun);
    /// A read that began then and of which nothing was heard until its caller's deadline.
    Reading overdue(const IC::MutableNode& node, unsigned int id, Clock::time_point begun);
    /// What is known of a property without asking the host: the last reading, else what the node stores.
    Reading known(const IC::MutableNode& node, unsigned int id) const;
    /// What an alert says of a property.
    /// @return the last value that was known before
    std::optional<IC::PropertyValue> note(unsigned int node, unsigned int id, const IC::PropertyValue& value);

private:
    struct Fact {
        IC::PropertyValue value;
        Clock::time_point asOf;
        bool stale = false;
    };
    using Key = std::pair<unsigned int, unsigned int>;  // node and property

    /// The last value, marked stale; one that has come since the read began stays good for others.
    void attachLast(const IC::MutableNode& node, Reading& reading, Clock::time_point begun);

    mutable std::mutex guard_;
    std::map<unsigned int, Clock::time_point> met_;  // the listed nodes; guarded by guard_
    std::map<Key, Fact> facts_;                      // guarded by guard_
};

}  // namespace cvagent
