#include "agent/undo/ended_leases.h"

#include <algorithm>
#include <chrono>
#include <thread>

#include "agent/undo/boot_clock.h"

namespace cvagent::undo {

namespace {

bool isIn(const std::vector<Entry>& entries, const Entry& entry) {
    return std::ranges::find(entries, entry.same, &Entry::same) != entries.end();
}

}  // namespace

EndedLeases::EndedLeases(const NetworkChange& change, const std::vector<unsigned>& links)
    : change_(change), links_(links) {
    constexpr std::uint64_t kLongest = 5000;
    constexpr std::chrono::milliseconds kLook{20};
    const std::uint64_t end = bootMilliseconds() + kLongest;
    told_ = change.isKeeperTold ? NetworkState::read() : change.now;
    while (change.isKeeperTold && hasAny() && bootMilliseconds() < end) {
        std::this_thread::sleep_for(kLook);
        told_ = NetworkState::read();
    }
}

std::set<std::string> EndedLeases::takeOut(const EntryKind& kind, std::vector<Entry>& now) const {
    const std::vector<Entry> there = kind.entries(told_, links_);
    std::set<std::string> groups;
    std::erase_if(now, [&](const Entry& each) {
        const bool hasEnded = !isIn(there, each) && isSince(kind, each);
        if (hasEnded) {
            groups.insert(each.group);
        }
        return hasEnded;
    });
    return groups;
}

bool EndedLeases::isSince(const EntryKind& kind, const Entry& entry) const {
    const auto isOld = [&](const NetworkState* state) {
        return state != nullptr && isIn(kind.entries(*state, links_), entry);
    };
    return kind.isLeased != nullptr && kind.isLeased(entry.message, change_.now.network) &&
           !isOld(&change_.before) && !isOld(change_.left);
}

bool EndedLeases::hasAny() const {
    return std::ranges::any_of(entryKinds(), [this](const EntryKind& kind) {
        const std::vector<Entry> there = kind.entries(told_, links_);
        return std::ranges::any_of(there, [&](const Entry& each) { return isSince(kind, each); });
    });
}

}  // namespace cvagent::undo
