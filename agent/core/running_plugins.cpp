#include "agent/core/running_plugins.h"

#include <algorithm>
#include <array>
#include <mutex>
#include <shared_mutex>
#include <utility>

#include "agent/core/problem.h"
#include "agent/core/tree.h"

namespace cvagent {

namespace {

// Far more nodes than a plug-in makes in years of taking drives out and in, and numbers that people can read.
constexpr unsigned int kIdsEach = 100000000;
constexpr std::size_t kPlaces = 20;  // all ids fit a signed number

std::shared_mutex placesGuard;
std::array<IC::ManagementInterface*, kPlaces> places{};  // guarded by placesGuard

IC::Error failure(const std::string& text) {
    return {IC::Error::failure, IC::Number(), text};
}

/// Own nodes first: what else is loaded must not make a plug-in's own names ambiguous.
Handle findFrom(std::size_t place, const std::string& name) {
    try {
        return findNode(*places[place], name);
    } catch (const Problem& problem) {
        if (problem.kind() != Problem::notFound) {
            throw;
        }
    }
    std::vector<Handle> all;
    for (const IC::ManagementInterface* interface : places) {
        if (interface != nullptr) {
            const std::vector<Handle> nodes = interface->holdAll();
            all.insert(all.end(), nodes.begin(), nodes.end());
        }
    }
    return findNode(all, name);
}

template <std::size_t place>
IC::Error findByName(const std::string& name, IC::Node** node) {
    const std::shared_lock lock(placesGuard);
    if (places[place] == nullptr) {
        return failure("no plug-in is loaded");
    }
    try {
        *node = findFrom(place, name).get();
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
    const std::shared_lock lock(placesGuard);
    const std::vector<unsigned int> owners = known->getMIIds();
    const std::size_t place = owners.empty() ? 0 : owners.front() - 1;
    return place < kPlaces && places[place] != nullptr ? makePath(*places[place], *known) : std::string();
}

}  // namespace

RunningPlugin::RunningPlugin(IC::ManagementInterface& interface) {
    const std::unique_lock lock(placesGuard);
    if (std::find(places.begin(), places.end(), &interface) != places.end()) {
        throw Problem(Problem::refused, "the plug-in is loaded already");
    }
    const auto free = std::find(places.begin(), places.end(), nullptr);
    if (free == places.end()) {
        throw Problem(Problem::refused, "more than " + std::to_string(kPlaces) + " plug-ins");
    }
    *free = &interface;
    place_ = static_cast<std::size_t>(free - places.begin());
    IC::Node::setPathSource(pathOfUnseen);
}

RunningPlugin::~RunningPlugin() {
    const std::unique_lock lock(placesGuard);
    places[place_] = nullptr;
    const bool last =
        std::all_of(places.begin(), places.end(), [](const auto* one) { return one == nullptr; });
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
