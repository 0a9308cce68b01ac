#include "agent/core/event.h"

#include "agent/core/node_classes.h"

namespace cvagent {

const char* eventName(Event::Kind kind) {
    switch (kind) {
        case Event::Kind::published:
            return "published";
        case Event::Kind::withdrawn:
            return "withdrawn";
        case Event::Kind::alert:
            break;
    }
    return "alert";
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

Event alertEvent(const IC::Alert& alert) {
    Event event;
    event.time = std::time(nullptr);
    event.message = alert.message();
    event.firstCode = alert.firstCode();
    event.secondCode = alert.secondCode();
    event.eventCode = alert.nodeId();  // the number that receivers key on
    if (!alert.substitutions().empty()) {
        event.path = alert.substitutions().front();
    }
    return event;
}

}  // namespace cvagent
