#include "agent/undo/network_restore.h"

#include <linux/rtnetlink.h>
#include <net/if.h>

#include <algorithm>
#include <chrono>
#include <cstring>
#include <iterator>
#include <map>
#include <set>
#include <thread>

#include "agent/undo/link_restore.h"
#include "agent/undo/network_entries.h"
#include "agent/undo/settled_leases.h"

namespace cvagent::undo {

namespace {

using hosttools::NetlinkSocket;
using Entries = std::vector<Entry>;

// Places in entryKinds().
constexpr std::size_t kAddresses = 0;
constexpr std::size_t kRoutes = 2;

constexpr int kRounds = 3;
constexpr std::chrono::milliseconds kPause{200};  // drivers and the kernel's own work take their time

std::set<std::string> textsOf(const Entries& entries, std::string Entry::*part = &Entry::same) {
    std::set<std::string> texts;
    for (const Entry& each : entries) {
        texts.insert(each.*part);
    }
    return texts;
}

std::vector<unsigned> linksOf(const NetworkState& state) {
    std::vector<unsigned> links;
    for (const NetworkMessage& link : state.network.links) {
        links.push_back(static_cast<unsigned>(
            hosttools::readPlain<ifinfomsg>(link.body).value_or(ifinfomsg{}).ifi_index));
    }
    return links;
}

std::map<std::string, Entries> groupsOf(const Entries& entries) {
    std::map<std::string, Entries> groups;
    for (const Entry& each : entries) {
        groups[each.group].push_back(each);
    }
    return groups;
}

bool isSame(const Entries& one, const Entries& other) {
    return std::ranges::equal(one, other, {}, &Entry::same, &Entry::same);
}

/// What should be there of a group in the end: what was there before and has been taken away by the change or
/// is still there, then what others have made since.
Entries wantedOf(const Entries& before, const Entries& left, const Entries& now) {
    const auto old = textsOf(before);
    const auto made = textsOf(left);
    const auto there = textsOf(now);
    Entries wanted;
    std::ranges::copy_if(before, std::back_inserter(wanted), [&](const Entry& each) {
        return there.contains(each.same) || !made.contains(each.same);
    });
    std::ranges::copy_if(now, std::back_inserter(wanted), [&](const Entry& each) {
        return !old.contains(each.same) && !made.contains(each.same);
    });
    return wanted;
}

/// Three looks at the entries of one kind.
struct Looks {
    Entries before;
    Entries left;
    Entries now;
    std::set<std::string> freed;  ///< groups in which a lease was that has ended
};

/// @param tell is called for one that somebody else has set since, and that stays
template <class Tell>
Entries wantedOf(const EntryKind& kind, const Looks& looks, Tell tell) {
    auto before = groupsOf(looks.before);
    auto left = groupsOf(looks.left);
    auto now = groupsOf(looks.now);
    std::set<std::string> names;
    for (const Entries* each : {&looks.before, &looks.now}) {
        names.merge(textsOf(*each, &Entry::group));
    }
    Entries wanted;
    for (const std::string& name : names) {
        const bool isFreed = looks.freed.contains(name);
        const bool isOthers =
            kind.isOneValue && !isFreed && !isSame(left[name], now[name]) && !isSame(before[name], now[name]);
        if (isOthers && !isSame(before[name], left[name])) {
            tell(before[name].empty() ? left[name].front() : before[name].front());
        }
        const Entries made = isFreed ? Entries() : left[name];
        const Entries group = isOthers ? now[name] : wantedOf(before[name], made, now[name]);
        wanted.insert(wanted.end(), group.begin(), group.end());
    }
    return wanted;
}

/// How to come from what is to what is wanted. What stands behind a difference goes and comes back in its
/// order.
struct Difference {
    Entries remove;  ///< the newest first
    Entries add;
};
Difference difference(const Entries& now, const Entries& wanted) {
    Difference steps;
    auto groups = groupsOf(now);
    for (const auto& [group, all] : groupsOf(wanted)) {
        Entries& is = groups[group];
        const auto same = [](const Entry& one, const Entry& other) { return one.same == other.same; };
        const auto [kept, from] = std::mismatch(is.begin(), is.end(), all.begin(), all.end(), same);
        steps.add.insert(steps.add.end(), from, all.end());
        is.erase(is.begin(), kept);
    }
    for (const auto& [group, tooMuch] : groups) {
        steps.remove.insert(steps.remove.end(), tooMuch.rbegin(), tooMuch.rend());
    }
    std::ranges::stable_sort(steps.add, {}, &Entry::rank);
    std::ranges::stable_sort(steps.remove, std::greater<>(), &Entry::rank);
    return steps;
}

class Restore {
public:
    Restore(const NetworkChange& change, std::vector<std::string>& notes)
        : change_(change), notes_(notes), links_(linksOf(change.before)) {
        const NetworkState& left = change.left != nullptr ? *change.left : change.now;
        const SettledLeases leases(change, links_);
        for (const EntryKind& kind : entryKinds()) {
            Looks looks{kind.entries(change.before, links_),
                        kind.entries(left, links_),
                        kind.entries(change.now, links_),
                        {}};
            looks.freed = leases.takeOut(kind, looks.now);
            wanted_.push_back(wantedOf(kind, looks, [&](const Entry& each) {
                notes_.push_back(kind.text(each.message, change.before.network) +
                                 " has been changed by somebody else since and is not put back");
            }));
        }
        dropWhatIsOver();
    }

    void run() {
        for (int round = 0; round < kRounds && !isDone(); ++round) {
            if (round > 0) {
                std::this_thread::sleep_for(kPause);
            }
            putBackLinks(socket_, change_);
            removeAll();
            addAll();
        }
        tellRest();
    }

private:
    /// A lease that would be over by now.
    void dropWhatIsOver() {
        std::erase_if(wanted_.front(), [this](Entry& each) {
            const bool isLeft = age(each.message, change_.seconds);
            if (!isLeft) {
                notes_.push_back(entryKinds().front().text(each.message, change_.before.network) +
                                 " is not put back: its time is over");
            }
            return !isLeft;
        });
    }

    Difference differenceOf(std::size_t kind, const NetworkState& now) const {
        return difference(ours(kind, entryKinds()[kind].entries(now, links_)), wanted_[kind]);
    }

    /// What has been made by others while this is at work is none of ours.
    Entries ours(std::size_t kind, Entries now) const {
        const auto wanted = textsOf(wanted_[kind], &Entry::key);
        const auto began = textsOf(entryKinds()[kind].entries(change_.now, links_), &Entry::key);
        std::erase_if(
            now, [&](const Entry& each) { return !wanted.contains(each.key) && !began.contains(each.key); });
        return now;
    }

    bool isDone() const {
        const NetworkState now = NetworkState::read();
        if (now.network.problem != 0 || !linksToPutBack(change_, now).empty()) {
            return false;
        }
        for (std::size_t kind = 0; kind < wanted_.size(); ++kind) {
            const Difference left = differenceOf(kind, now);
            if (!left.add.empty() || !left.remove.empty()) {
                return false;
            }
        }
        return true;
    }

    void removeAll() {
        const NetworkState now = NetworkState::read();
        for (std::size_t kind = wanted_.size(); kind-- > 0;) {
            for (const Entry& each : differenceOf(kind, now).remove) {
                if (kind == kAddresses) {
                    removeRoutesThatPrefer(each.message, now);
                }
                entryKinds()[kind].remove(socket_, each.message);
            }
        }
    }

    /// They would lose that preference and stay, as routes that nobody has made.
    void removeRoutesThatPrefer(const NetworkMessage& address, const NetworkState& now) {
        for (const Entry& each : ours(kRoutes, entryKinds()[kRoutes].entries(now, links_))) {
            if (prefers(each.message, address)) {
                entryKinds()[kRoutes].remove(socket_, each.message);
            }
        }
    }

    /// The removal, and each kind before, may have taken more with it.
    void addAll() {
        problems_.clear();
        for (std::size_t kind = 0; kind < wanted_.size(); ++kind) {
            for (const Entry& each : differenceOf(kind, NetworkState::read()).add) {
                const int problem = entryKinds()[kind].add(socket_, each.message);
                if (problem != 0) {
                    problems_[each.same] = problem;
                }
            }
        }
    }

    void tellRest() {
        const NetworkState now = NetworkState::read();
        for (const std::string& link : linksToPutBack(change_, now)) {
            notes_.push_back(link + " is not put back");
        }
        for (std::size_t kind = 0; kind < wanted_.size(); ++kind) {
            const auto tell = [&](const Entry& each, const std::string& what) {
                const auto problem = problems_.find(each.same);
                notes_.push_back(
                    entryKinds()[kind].text(each.message, change_.before.network) + what +
                    (problem == problems_.end() ? "" : std::string(": ") + std::strerror(problem->second)));
            };
            const Difference left = differenceOf(kind, now);
            std::ranges::for_each(left.add, [&](const Entry& each) { tell(each, " is not put back"); });
            std::ranges::for_each(left.remove, [&](const Entry& each) { tell(each, " is still there"); });
        }
        tellOfOthers(now);
    }

    /// Routes that were there before, that the change has taken away, and that are not ours to make.
    void tellOfOthers(const NetworkState& now) {
        const NetworkState& left = change_.left != nullptr ? *change_.left : change_.now;
        const auto kept = routesOfOthers(left.network);
        const auto back = routesOfOthers(now.network);
        for (const std::string& route : routesOfOthers(change_.before.network)) {
            if (!std::ranges::binary_search(kept, route) && !std::ranges::binary_search(back, route)) {
                notes_.push_back(route +
                                 " is not put back: the kernel, a router or a routing program makes it");
            }
        }
    }

    const NetworkChange& change_;
    std::vector<std::string>& notes_;
    std::vector<unsigned> links_;
    std::vector<Entries> wanted_;          ///< one list for each kind
    std::map<std::string, int> problems_;  ///< of the last round, by what makes an entry the same
    NetlinkSocket socket_{NETLINK_ROUTE};
};

}  // namespace

NetworkState NetworkState::read() {
    NetlinkSocket socket(NETLINK_ROUTE);
    NetworkState state;
    state.network = readNetwork(socket);
    state.neighbours = readPermanentNeighbours(socket, state.network.problem);
    return state;
}

bool isSameNetwork(const NetworkState& before, const NetworkState& after) {
    const std::vector<unsigned> links = linksOf(before);
    return before.network.problem == 0 && after.network.problem == 0 &&
           linksToPutBack({before, &after, after, 0}, after).empty() &&
           std::ranges::all_of(entryKinds(), [&](const EntryKind& kind) {
               return isSame(kind.entries(before, links), kind.entries(after, links));
           });
}

void putBackNetwork(const NetworkChange& change, std::vector<std::string>& notes) {
    for (const NetworkState* each : {&change.before, change.left, &change.now}) {
        if (each != nullptr && each->network.problem != 0) {
            notes.push_back(std::string("the network is not put back: it could not be read: ") +
                            std::strerror(each->network.problem));
            return;
        }
    }
    Restore(change, notes).run();
}

}  // namespace cvagent::undo
