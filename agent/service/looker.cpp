#include "agent/service/looker.h"

#include <algorithm>
#include <map>
#include <set>
#include <span>
#include <utility>

#include "agent/service/names.h"
#include "agent/service/values.h"

namespace cvagent::service {

namespace {

/// What hangs is stale after this; the next look finds it again.
constexpr std::chrono::seconds kLongestLook{15};

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

}  // namespace

Looker::~Looker() {
    stop();
    if (thread_.joinable()) {
        thread_.join();
    }
}

Look Looker::firstLook() {
    const auto now = Clock::now();
    const std::vector<NodeRef> nodes = agent_.nodes();
    std::vector<std::vector<Reading>> readings = agent_.readTree(nodes, lookRequest());
    Look look{++begun_, true, {}, {}};
    for (std::size_t i = 0; i < nodes.size(); ++i) {
        for (Reading& reading : readings[i]) {
            reading.asOf = reading.failed() ? reading.asOf : reading.asOf.value_or(now);
        }
        look.order.push_back(nodes[i]->getNodeId());
        look.nodes.push_back(viewOf(nodes[i], std::move(readings[i])));
    }
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

void Looker::lookAgain(std::uint32_t node) {
    const std::lock_guard lock(guard_);
    wanted_.nodes.insert(node);
    changed_.notify_all();
}

void Looker::lookAtAll() {
    const std::lock_guard lock(guard_);
    wanted_.all = true;
    changed_.notify_all();
}

Looker::Wanted Looker::waitForWanted() {
    std::unique_lock lock(guard_);
    changed_.wait(lock, [this] { return stopped_ || wanted_.any(); });
    changed_.wait_for(lock, settling_.load(), [this] { return stopped_; });
    return stopped_ ? Wanted() : std::exchange(wanted_, {});
}

void Looker::run() {
    for (Wanted wanted = waitForWanted(); wanted.any(); wanted = waitForWanted()) {
        deliver_(look(wanted));
    }
}

/// What the node stores and what a read tells otherwise, all of it read now, as a new agent would show it:
/// where a read fails of which a tree does not show the failure, what is stored stays. What the host does not
/// tell in time is the last value.
std::vector<Reading> Looker::readAgain(const NodeRef& node, const Request& request) const {
    const NodeClass* known = findClass(node->nodeType());
    const std::span<const unsigned int> live =
        known != nullptr ? known->live : std::span<const unsigned int>();
    std::map<unsigned int, Reading> stored;
    std::set<unsigned int> ids(live.begin(), live.end());
    for (const Reading& reading : storedReadings(*node)) {
        stored.emplace(reading.id, reading);
        ids.insert(reading.id);
    }
    std::vector<Reading> readings =
        agent_.read(node, {ids.begin(), ids.end()}, cvagent::Freshness::now, request);
    for (Reading& reading : readings) {
        const bool isLive = std::ranges::find(live, reading.id) != live.end();
        const auto before = stored.find(reading.id);
        if (reading.failed() && !reading.timedOut && !isLive && before != stored.end()) {
            reading = before->second;
        }
    }
    std::erase_if(readings, [&stored](const Reading& reading) {
        return reading.missing && !stored.contains(reading.id);
    });
    return readings;
}

Look Looker::look(const Wanted& wanted) {
    Look look{++begun_, wanted.all, {}, {}};
    const Request request = lookRequest();
    for (const NodeRef& node : agent_.nodes()) {
        const std::uint32_t id = node->getNodeId();
        look.order.push_back(id);
        if (wanted.all || wanted.nodes.contains(id)) {
            look.nodes.push_back(viewOf(node, readAgain(node, request)));
        }
    }
    return look;
}

}  // namespace cvagent::service
