#pragma once

#include <set>
#include <string>
#include <vector>

#include "agent/undo/network_entries.h"

namespace cvagent::undo {

/// The leases that have come since a change and have ended again when the system that keeps the interface was
/// told of its old files: a static one has no use for them. They are nobody else's work that would have to
/// stay, and what they had taken the place of is wanted again.
class EndedLeases {
public:
    /// A daemon ends them behind its answer: waits for that, five seconds at most.
    /// @param links that are known
    EndedLeases(const NetworkChange& change, const std::vector<unsigned>& links);

    /// @param now the entries of one kind when the taking back began
    /// @return the groups that they stood in
    std::set<std::string> takeOut(const EntryKind& kind, std::vector<Entry>& now) const;

private:
    bool isSince(const EntryKind& kind, const Entry& entry) const;
    bool hasAny() const;

    const NetworkChange& change_;
    const std::vector<unsigned>& links_;
    NetworkState told_;  ///< what is there still
};

}  // namespace cvagent::undo
