#include "agent/core/announcer.h"

namespace cvagent {

namespace {

std::string stateText(const Reading& reading) {
    return reading.failed() ? std::string() : static_cast<std::string>(reading.value);
}

}  // namespace

void Announcer::hear(const Event& event) {
    if (event.kind == Event::Kind::alert) {
        hearAlert(event);
        return;
    }
    if (event.kind == Event::Kind::published) {
        const std::lock_guard lock(guard_);
        facts_.meet(event.nodeId);
        if (early_.erase(event.nodeId) > 0) {
            return;
        }
        events_.hear(event);
        return;
    }
    {
        const std::lock_guard lock(guard_);
        early_.erase(event.nodeId);
        facts_.forget(event.nodeId);
    }
    events_.hear(event);
}

void Announcer::hearAlert(Event event) {
    if (!event.propertyName.empty()) {
        const IC::PropertyValue after(IC::Number(static_cast<unsigned int>(std::stoul(event.after))), true);
        if (const auto before = facts_.note(event.nodeId, event.property, after)) {
            event.before = static_cast<std::string>(*before);
        }
    }
    events_.hear(event);
}

void Announcer::takeStock(const std::vector<Handle>& nodes) {
    for (const Handle& node : nodes) {
        facts_.meet(node->getNodeId());
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

void Announcer::announceWrite(const IC::MutableNode& node, const Reading& before, const Reading& after,
                              const std::string& caller) {
    Event event = nodeEvent(Event::Kind::written, node);
    event.property = after.id;
    event.propertyName = after.name();
    event.before = stateText(before);
    event.after = stateText(after);
    event.caller = caller;
    events_.hear(event);
}

}  // namespace cvagent
