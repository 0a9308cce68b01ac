#include "agent/core/event.h"

#include <algorithm>
#include <array>

#include "agent/core/catalogue.h"

namespace cvagent {

namespace {

/// The state that an alert tells, and the one that the node stores.
void tellState(Event& event, const IC::MutableNode& node) {
    const AlertRow* row = findAlert(event.message);
    const Property* property = row != nullptr ? findProperty(node.nodeType(), row->property) : nullptr;
    if (property == nullptr) {
        return;
    }
    event.property = property->id;
    event.propertyName = property->name;
    event.after = std::to_string(row->after);
    const Properties stored = storedProperties(node);
    if (const auto known = stored.find(property->id); known != stored.end()) {
        event.before = static_cast<std::string>(known->second);
    }
}

}  // namespace

const char* eventName(Event::Kind kind) {
    static constexpr std::array kNames = {"published", "withdrawn", "alert", "written", "changed"};
    return kNames.at(static_cast<std::size_t>(kind));
}

Event nodeEvent(Event::Kind kind, const IC::Node& node) {
    Event event;
    event.kind = kind;
    event.time = std::time(nullptr);
    event.path = node.getPath();
    event.message = node.getDescription();
    if (const auto* known = dynamic_cast<const IC::MutableNode*>(&node)) {
        event.nodeId = known->getNodeId();
        event.nodeClass = className(known->nodeType());
    }
    return event;
}

Event alertEvent(const IC::Alert& alert, const std::vector<Handle>& nodes) {
    Event event;
    event.time = std::time(nullptr);
    event.message = alert.message();
    event.firstCode = alert.firstCode();
    event.secondCode = alert.secondCode();
    event.eventCode = alert.eventCode();
    if (!alert.substitutions().empty()) {
        event.path = alert.substitutions().front();
    }
    const auto node = std::find_if(nodes.begin(), nodes.end(), [&event](const Handle& candidate) {
        return candidate->getPath() == event.path;
    });
    if (node != nodes.end()) {
        event.nodeId = (*node)->getNodeId();
        event.nodeClass = className((*node)->nodeType());
        tellState(event, **node);
    }
    return event;
}

}  // namespace cvagent
