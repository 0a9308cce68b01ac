#include "agent/core/announcer.h"

#include <limits>
#include <set>

#include "framework/qx/whole_number.h"

namespace cvagent {

namespace {

std::string stateText(const Reading& reading) {
    return reading.failed() ? std::string() : static_cast<std::string>(reading.value);
}

}  // namespace

void Announcer::hear(const Event& event) {
    const std::lock_guard lock(guard_);
    switch (event.kind) {
        case Event::Kind::published:
            tellPublished(event);
            break;
        case Event::Kind::withdrawn:
            tellWithdrawn(event);
            break;
        case Event::Kind::alert:
            tellAlert(event);
            break;
        case Event::Kind::written:
        case Event::Kind::changed:
            events_.hear(event);
            break;
    }
}

void Announcer::tellPublished(const Event& event) {
    facts_.meet(event.nodeId);
    if (early_.erase(event.nodeId) == 0) {
        events_.hear(event);
    }
}

void Announcer::tellWithdrawn(const Event& event) {
    forget(event.nodeId);
    events_.hear(event);
}

/// guard_ is held.
void Announcer::forget(unsigned int node) {
    early_.erase(node);
    facts_.forget(node);
    told_.erase(told_.lower_bound({node, 0}),
                told_.upper_bound({node, std::numeric_limits<unsigned int>::max()}));
}

/// What a read has brought since the last event is not in the chain: its reader knows it.
void Announcer::tellAlert(Event event) {
    if (!event.propertyName.empty()) {
        const IC::PropertyValue after(IC::Number(QX::wholeNumber<unsigned int>(event.after).value()), true);
        const auto known = facts_.note(event.nodeId, event.property, after);
        const auto told = told_.find({event.nodeId, event.property});
        if (told != told_.end()) {
            event.before = told->second;
        } else if (known) {
            event.before = static_cast<std::string>(*known);
        }
        told_[{event.nodeId, event.property}] = event.after;
    }
    events_.hear(event);
    if (alertTold_) {
        alertTold_(event);
    }
}

void Announcer::takeStock(const IC::ManagementInterface& interface) {
    for (const Handle& node : interface.holdAll()) {
        const std::lock_guard lock(guard_);
        if (interface.hold(node->getNodeId())) {  // as below
            facts_.meet(node->getNodeId());
        }
    }
}

void Announcer::announceNew(const IC::ManagementInterface& interface) {
    for (const Handle& node : interface.holdAll()) {
        const unsigned int id = node->getNodeId();
        const std::lock_guard lock(guard_);
        // One that is withdrawn in this moment waits with its event for the guard.
        if (interface.hold(id) && facts_.meet(id)) {
            early_.insert(id);
            events_.hear(nodeEvent(Event::Kind::published, *node));
        }
    }
}

void Announcer::announceRestart(const std::vector<std::shared_ptr<IC::MutableNode>>& before,
                                const IC::ManagementInterface& interface) {
    const auto after = interface.holdAll();
    const auto pathsOf = [](const std::vector<std::shared_ptr<IC::MutableNode>>& nodes) {
        std::set<std::string> paths;
        for (const auto& node : nodes) {
            paths.insert(node->getPath());
        }
        return paths;
    };
    const std::set<std::string> were = pathsOf(before);
    const std::set<std::string> are = pathsOf(after);
    const std::lock_guard lock(guard_);
    for (const auto& node : before) {
        forget(node->getNodeId());
        if (!are.contains(node->getPath())) {
            events_.hear(nodeEvent(Event::Kind::withdrawn, *node));
        }
    }
    for (const auto& node : after) {
        if (facts_.meet(node->getNodeId()) && !were.contains(node->getPath())) {
            events_.hear(nodeEvent(Event::Kind::published, *node));
        }
    }
}

void Announcer::announceWrite(const IC::MutableNode& node, const Write& write) {
    Event event = nodeEvent(Event::Kind::written, node);
    event.property = write.after.id;
    event.propertyName = write.after.name();
    event.before = stateText(write.before);
    event.after = stateText(write.after);
    event.caller = write.caller;
    event.wanted = write.wanted;
    event.verdict = write.verdict;
    event.plan = write.plan;
    const std::lock_guard lock(guard_);
    const auto told = told_.find({event.nodeId, event.property});
    if (told != told_.end() && !write.refused) {
        told->second = event.after;
    }
    events_.hear(event);
}

}  // namespace cvagent
