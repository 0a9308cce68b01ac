#pragma once

#include <set>
#include <string>
#include <vector>

#include "agent/undo/network_entries.h"

namespace cvagent::undo {

/// The leases of a network when the system that keeps an interface has been told of its old files. It ends
/// and asks for them behind its answer, and does not get on with one that somebody else has put back
/// meanwhile: it is given five seconds. What it has ended that has come since the change is nobody else's
/// work that would have to stay, and what that had taken the place of is wanted again.
class SettledLeases {
public:
    /// @param links that are known
    SettledLeases(const NetworkChange& change, const std::vector<unsigned>& links);

    /// @param now the entries of one kind when the taking back began
    /// @return the groups of those that have been ended
    std::set<std::string> takeOut(const EntryKind& kind, std::vector<Entry>& now) const;

private:
    using Entries = std::vector<Entry>;
    /// Of a kind that leases bring.
    struct Looks {
        const EntryKind* kind;
        Entries old;    ///< of before the change; taken away by it, or still there when the taking back began
        Entries since;  ///< neither of before the change nor its work
    };
    bool isSettled() const;

    std::vector<unsigned> links_;
    std::vector<Looks> leases_;
    NetworkState told_;
};

}  // namespace cvagent::undo
