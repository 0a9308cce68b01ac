#include "agent/service/looker.h"

#include <algorithm>
#include <iterator>
#include <set>
#include <utility>

#include "agent/service/concerns.h"
#include "agent/service/log.h"
#include "agent/service/names.h"
#include "agent/service/values.h"
#include "framework/ic/link_state.h"

namespace cvagent::service {

namespace {

/// What hangs is stale after this; a later look asks for it again.
constexpr std::chrono::seconds kLongestLook{15};

/// When a plug-in that hears the kernel itself has looked.
constexpr std::chrono::milliseconds kTheirLook{1500};
constexpr unsigned int kLinkState = 123;

Request lookRequest() {
    return Request("the service", Request::Clock::now() + kLongestLook);
}

NodeView viewOf(const NodeRef& node, std::vector<Reading> readings) {
    const std::uint32_t type = node->nodeType();
    std::string name = className(type);
    std::string interface = interfaceOf(name);
    return {node,
            node->getNodeId(),
            node->getLinkedId(),
            type,
            node->getIndex(),
            node->getStatus(),
            std::move(name),
            std::move(interface),
            node->getPath(),
            {},
            node->getDescription(),
            std::move(readings),
            wallClock()};
}

bool isNewOf(const HostChange& change, const NodeRef& node) {
    return change.any() &&
           looksByItself(className(node->nodeType()), change.concernOf(nameOf(*node)), change.drives);
}

}  // namespace

Looker::~Looker() {
    stop();
    if (thread_.joinable()) {
        thread_.join();
    }
}

Look Looker::firstLook(const LinkIndices& linksBefore) {
    keeper_.noteStart(linksBefore);
    files_.haveChanged();
    const std::vector<NodeRef> nodes = agent_.nodes();
    Look look{++begun_, true, {}, readFirst(nodes, lookRequest())};
    for (const NodeRef& node : nodes) {
        look.order.push_back(node->getNodeId());
        met_.insert(node->getNodeId());
    }
    late_.endLook(look, Clock::now());
    return look;
}

void Looker::start() {
    thread_ = std::thread([this] { run(); });
}

void Looker::stop() {
    const std::lock_guard lock(guard_);
    stopped_ = true;
    changed_.notify_all();
}

template <class Change>
void Looker::want(const Change& change) {
    const std::lock_guard lock(guard_);
    const bool none = !wanted_.any();
    change(wanted_);
    lastTold_ = Clock::now();
    firstTold_ = none ? lastTold_ : firstTold_;
    if (none || wanted_.atOnce) {
        changed_.notify_all();
    }
}

void Looker::lookAgain(std::uint32_t node) {
    want([node](Wanted& wanted) { wanted.nodes.insert(node); });
}

void Looker::wrote(std::uint32_t node) {
    want([node](Wanted& wanted) {
        wanted.nodes.insert(node);
        wanted.atOnce = true;
    });
}

void Looker::lookAtAll() {
    want([](Wanted& wanted) { wanted.all = true; });
}

void Looker::hear(const HostChange& change) {
    want([&change](Wanted& wanted) { wanted.host.add(change); });
}

void Looker::alertCame(std::uint32_t node) {
    want([node](Wanted& wanted) { wanted.alerted.insert(node); });
}

/// When to look at what is wanted; guard_ is held.
Looker::Clock::time_point Looker::lookTime() const {
    constexpr std::chrono::milliseconds kLongest{1000};
    constexpr int kMostSettlings = 5;
    const std::chrono::milliseconds settling = settling_;
    const auto longest = std::min(std::max(settling, kLongest), kMostSettlings * settling);
    const auto settled = std::min(lastTold_ + settling, firstTold_ + longest);
    return std::max(restUntil_, wanted_.atOnce ? firstTold_ : settled);
}

Looker::Wanted Looker::waitForWanted() {
    std::unique_lock lock(guard_);
    const auto ready = [this] { return stopped_ || wanted_.any(); };
    if (const auto next = due()) {
        wanted_.follow = !changed_.wait_until(lock, *next, ready);
    } else {
        changed_.wait(lock, ready);
    }
    while (!stopped_ && Clock::now() < lookTime()) {
        changed_.wait_until(lock, lookTime());
    }
    return stopped_ ? Wanted() : std::exchange(wanted_, {});
}

/// When to look though nothing is told.
std::optional<Looker::Clock::time_point> Looker::due() const {
    std::optional<Clock::time_point> first = keeper_.due();
    for (const auto& other : {laterAt_, late_.due()}) {
        first = first && other ? std::min(*first, *other) : first ? first : other;
    }
    return first;
}

/// Adds what was put off until now, and puts off what was heard.
void Looker::noteForLater(Wanted& wanted) {
    const auto now = Clock::now();
    const HostChange heard = wanted.host;
    if (laterAt_ && *laterAt_ <= now) {
        wanted.later = std::exchange(later_, {});
        laterAt_.reset();
    }
    if (heard.any()) {
        later_.add(heard);
        laterAt_ = now + kTheirLook;
    }
}

void Looker::run() {
    for (Wanted wanted = waitForWanted(); wanted.any(); wanted = waitForWanted()) {
        const auto begun = Clock::now();
        noteForLater(wanted);
        wanted.hostFiles = files_.haveChanged();
        deliver_(look(wanted));
        const auto ended = Clock::now();
        restUntil_ = ended + (ended - begun);
    }
}

/// As a start shows a node: what is stored is as old as the node.
std::vector<NodeView> Looker::readFirst(const std::vector<NodeRef>& nodes, const Request& request) {
    const auto now = Clock::now();
    std::vector<std::vector<Reading>> readings = agent_.readTree(nodes, request);
    std::vector<NodeView> views;
    for (std::size_t i = 0; i < nodes.size(); ++i) {
        for (Reading& reading : readings[i]) {
            reading.asOf = reading.failed() ? reading.asOf : reading.asOf.value_or(now);
        }
        views.push_back(viewOf(nodes[i], std::move(readings[i])));
    }
    return views;
}

/// What the host tells now. A property that it no longer tells is not known any more; one of which it tells
/// nothing in time keeps its last value.
std::vector<NodeView> Looker::readAgain(const std::vector<Agent::Asked>& asked, const Request& request) {
    std::vector<std::vector<Reading>> readings = agent_.readAnew(asked, request);
    std::vector<NodeView> views;
    for (std::size_t i = 0; i < asked.size(); ++i) {
        views.push_back(viewOf(asked[i].node, std::move(readings[i])));
        views.back().asked = asked[i].ids;
    }
    return views;
}

/// An IP configuration is as its link is listed, by its name or any that has it within, as the plug-in looks
/// for it.
/// @return whether it is another status
bool Looker::setStatus(const NodeRef& node) const {
    if (!links_ || node->nodeType() != static_cast<unsigned int>(NodeType::ipConfig)) {
        return false;
    }
    const std::string name = nameOf(*node);
    const bool isUp = std::ranges::any_of(*links_, [&name](const auto& link) {
        return link.second.isUp && link.second.name.find(name) != std::string::npos;
    });
    const unsigned int status = isUp ? IC::LinkState::up : IC::LinkState::down;
    const bool differs = node->getStatus() != status;
    agent_.setStatus(node, status);
    return differs;
}

/// Whether all that a tree shows of the node may be different.
bool Looker::isWhollyWanted(const NodeRef& node, const Wanted& wanted) {
    return wanted.all || wanted.nodes.contains(node->getNodeId()) || isNewOf(wanted.later, node) ||
           isNewOf(wanted.host, node);
}

/// What to ask of a node that is known; nothing when nothing of it may be different.
std::optional<Agent::Asked> Looker::askedOf(const NodeRef& node, const Wanted& wanted) const {
    if (isWhollyWanted(node, wanted)) {
        setStatus(node);
        return Agent::Asked{node};
    }
    const unsigned int ofHost = wanted.hostFiles ? concernsHost : 0U;
    const std::string name = nameOf(*node);
    // A list of routes that is read while others come and go may lack some: once more when they have settled.
    const unsigned int ofRoutes = wanted.later.concernOf(name) & concernsRoute;
    const std::vector<unsigned int> concerned =
        concernedProperties(node->nodeType(), wanted.host.concernOf(name) | ofHost | ofRoutes);
    std::vector<unsigned int> ids;
    std::ranges::set_union(concerned, late_.of(node->getNodeId()), std::back_inserter(ids));
    if (wanted.host.any() && setStatus(node) && ids.empty()) {
        ids.push_back(kLinkState);
    }
    return ids.empty() ? std::nullopt : std::optional(Agent::Asked{node, std::move(ids)});
}

/// What a new node stores of the host is as old as its plug-in's start.
std::optional<Agent::Asked> Looker::askedOfNew(const NodeRef& node) {
    std::vector<unsigned int> ids = concernedProperties(node->nodeType(), concernsHost);
    return ids.empty() ? std::nullopt : std::optional(Agent::Asked{node, std::move(ids)});
}

/// What is not done because a write is at work is done at the next look.
void Looker::keepTree(const Wanted& wanted, const Request& request) {
    links_ = wanted.host.links ? wanted.host.links : links_;
    for (const std::uint32_t node : wanted.alerted) {
        keeper_.alertCame(node);
    }
    const auto due = keeper_.due();
    const bool isDue = due && *due <= Clock::now();
    if (!links_ || !(wanted.host.linksDiffer || wanted.host.drives || wanted.all || isDue)) {
        return;
    }
    try {
        if (keeper_.follow(*links_, request)) {
            met_.clear();
        }
    } catch (const Problem& problem) {
        log(Priority::info, std::string("links are followed later: ") + problem.what());
    }
}

Look Looker::look(const Wanted& wanted) {
    Look look{++begun_, wanted.all, {}, {}};
    keepTree(wanted, lookRequest());
    const Request request = lookRequest();  // of its own: on a slow host new links take longer to be found
    late_.beginLook(Clock::now());
    std::vector<NodeRef> fresh;
    std::vector<Agent::Asked> asked;
    const std::set<std::uint32_t> met = std::exchange(met_, {});
    for (const NodeRef& node : keeper_.shown()) {
        const std::uint32_t id = node->getNodeId();
        look.order.push_back(id);
        met_.insert(id);
        const bool isNew = !met.contains(id);
        if (isNew) {
            fresh.push_back(node);
        }
        if (auto questions = isNew ? askedOfNew(node) : askedOf(node, wanted)) {
            asked.push_back(*std::move(questions));
        }
    }
    look.nodes = readFirst(fresh, request);
    for (NodeView& view : readAgain(asked, request)) {
        look.nodes.push_back(std::move(view));
    }
    late_.endLook(look, Clock::now());
    return look;
}

}  // namespace cvagent::service
