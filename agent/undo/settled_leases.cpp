#include "agent/undo/settled_leases.h"

#include <algorithm>
#include <chrono>
#include <iterator>
#include <thread>

#include "agent/undo/boot_clock.h"

namespace cvagent::undo {

namespace {

bool isIn(const std::vector<Entry>& entries, const Entry& entry) {
    return std::ranges::find(entries, entry.same, &Entry::same) != entries.end();
}

}  // namespace

SettledLeases::SettledLeases(const NetworkChange& change, const std::vector<unsigned>& links)
    : links_(links), told_(change.now) {
    const NetworkState& left = change.left != nullptr ? *change.left : change.now;
    for (const EntryKind& kind : entryKinds()) {
        if (!change.isKeeperTold || kind.isLeased == nullptr) {
            continue;
        }
        const Entries before = kind.entries(change.before, links);
        const Entries made = kind.entries(left, links);
        const Entries now = kind.entries(change.now, links);
        Looks looks{&kind, {}, {}};
        std::ranges::copy_if(before, std::back_inserter(looks.old), [&](const Entry& each) {
            return kind.isLeased(each.message, change.before.network) &&
                   (isIn(now, each) || !isIn(made, each));
        });
        std::ranges::copy_if(now, std::back_inserter(looks.since), [&](const Entry& each) {
            return kind.isLeased(each.message, change.now.network) && !isIn(before, each) &&
                   !isIn(made, each);
        });
        leases_.push_back(std::move(looks));
    }
    constexpr std::uint64_t kLongest = 5000;
    constexpr std::chrono::milliseconds kBetweenLeaseLooks{20};
    const std::uint64_t end = bootMilliseconds() + kLongest;
    while (change.isKeeperTold) {
        told_ = NetworkState::read();
        if (isSettled() || bootMilliseconds() >= end) {
            break;
        }
        std::this_thread::sleep_for(kBetweenLeaseLooks);
    }
}

std::set<std::string> SettledLeases::takeOut(const EntryKind& kind, std::vector<Entry>& now) const {
    std::set<std::string> groups;
    const auto looks = std::ranges::find(leases_, &kind, &Looks::kind);
    if (looks == leases_.end()) {
        return groups;
    }
    const Entries there = kind.entries(told_, links_);
    std::erase_if(now, [&](const Entry& each) {
        const bool hasEnded = isIn(looks->since, each) && !isIn(there, each);
        if (hasEnded) {
            groups.insert(each.group);
        }
        return hasEnded;
    });
    return groups;
}

bool SettledLeases::isSettled() const {
    return std::ranges::all_of(leases_, [this](const Looks& looks) {
        const Entries there = looks.kind->entries(told_, links_);
        const auto isThere = [&there](const Entry& each) { return isIn(there, each); };
        return std::ranges::all_of(looks.old, isThere) && std::ranges::none_of(looks.since, isThere);
    });
}

}  // namespace cvagent::undo
