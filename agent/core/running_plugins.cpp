#include "agent/core/running_plugins.h"

#include <algorithm>
#include <array>
#include <condition_variable>
#include <mutex>
#include <utility>

#include "agent/core/problem.h"
#include "agent/core/tree.h"

namespace cvagent {

namespace {

// Far more nodes than a plug-in makes in years of taking drives out and in, and numbers that people can read.
constexpr unsigned int kIdsEach = 100000000;
constexpr std::size_t kPlaces = 20;  // all ids fit a signed number

struct Place {
    IC::ManagementInterface* interface = nullptr;
    unsigned int looks = 0;  // that are under way

    bool isFree() const { return interface == nullptr && looks == 0; }
};

std::mutex placesGuard;
std::condition_variable looked;       // a look has ended
std::array<Place, kPlaces> places{};  // guarded by placesGuard

/// The plug-ins that run at a moment; none of them goes while this lives. No lock is held meanwhile: a look
/// can lead to another one on the same thread, for the path of a node that is not known yet.
class Look {
public:
    Look() {
        const std::lock_guard lock(placesGuard);
        for (std::size_t i = 0; i < kPlaces; ++i) {
            seen_[i] = places[i].interface;
            places[i].looks += seen_[i] != nullptr ? 1 : 0;
        }
    }
    Look(const Look&) = delete;
    Look& operator=(const Look&) = delete;
    ~Look() {
        const std::lock_guard lock(placesGuard);
        for (std::size_t i = 0; i < kPlaces; ++i) {
            places[i].looks -= seen_[i] != nullptr ? 1 : 0;
        }
        looked.notify_all();
    }

    /// By place; null where there is none.
    const std::array<const IC::ManagementInterface*, kPlaces>& seen() const { return seen_; }

private:
    std::array<const IC::ManagementInterface*, kPlaces> seen_{};
};

IC::Error failure(const std::string& text) {
    return {IC::Error::failure, IC::Number(), text};
}

/// Own nodes first: what else is loaded must not make a plug-in's own names ambiguous.
Handle findFrom(const Look& look, std::size_t place, const std::string& name) {
    try {
        return findNode(*look.seen()[place], name);
    } catch (const Problem& problem) {
        if (problem.kind() != Problem::notFound) {
            throw;
        }
    }
    std::vector<Handle> all;
    for (const IC::ManagementInterface* interface : look.seen()) {
        if (interface != nullptr) {
            const std::vector<Handle> nodes = interface->holdAll();
            all.insert(all.end(), nodes.begin(), nodes.end());
        }
    }
    return findNode(all, name);
}

template <std::size_t place>
IC::Error findByName(const std::string& name, IC::Node** node) {
    const Look look;
    if (look.seen()[place] == nullptr) {
        return failure("no plug-in is loaded");
    }
    try {
        *node = findFrom(look, place, name).get();
        return {};
    } catch (const Problem& problem) {
        return failure(problem.what());
    }
}

template <std::size_t... all>
constexpr std::array<IC::FindCallBack, sizeof...(all)> makeFinders(std::index_sequence<all...> /*each*/) {
    return {findByName<all>...};
}

constexpr auto kFinders = makeFinders(std::make_index_sequence<kPlaces>());

/// The path of a node that its agent has not seen yet.
std::string pathOfUnseen(const IC::Node& node) {
    const auto* known = dynamic_cast<const IC::MutableNode*>(&node);
    if (known == nullptr) {
        return {};
    }
    const std::vector<unsigned int> owners = known->getMIIds();
    const std::size_t place = owners.empty() ? 0 : owners.front() - 1;
    if (place >= kPlaces) {
        return {};
    }
    const Look look;
    const IC::ManagementInterface* const interface = look.seen()[place];
    return interface != nullptr ? makePath(*interface, *known) : std::string();
}

}  // namespace

RunningPlugin::RunningPlugin(IC::ManagementInterface& interface) {
    const std::lock_guard lock(placesGuard);
    if (std::any_of(places.begin(), places.end(),
                    [&interface](const Place& place) { return place.interface == &interface; })) {
        throw Problem(Problem::refused, "the plug-in is loaded already");
    }
    const auto free =
        std::find_if(places.begin(), places.end(), [](const Place& place) { return place.isFree(); });
    if (free == places.end()) {
        throw Problem(Problem::refused, "more than " + std::to_string(kPlaces) + " plug-ins");
    }
    free->interface = &interface;
    place_ = static_cast<std::size_t>(free - places.begin());
    IC::Node::setPathSource(pathOfUnseen);
}

RunningPlugin::~RunningPlugin() {
    std::unique_lock lock(placesGuard);
    Place& own = places[place_];
    own.interface = nullptr;
    looked.wait(lock, [&own] { return own.looks == 0; });
    const bool last =
        std::all_of(places.begin(), places.end(), [](const Place& place) { return place.isFree(); });
    if (last) {
        IC::Node::setPathSource(nullptr);
    }
}

IdRange RunningPlugin::ids() const {
    const auto before = static_cast<unsigned int>(place_) * kIdsEach;
    return {static_cast<unsigned int>(place_) + 1, before + 1, before + 2, before + kIdsEach};
}

IC::FindCallBack RunningPlugin::finder() const {
    return kFinders[place_];
}

}  // namespace cvagent
