#pragma once

#include <ctime>
#include <string>

#include "framework/ic/alert.h"
#include "framework/ic/node.h"

namespace cvagent {

/// Something the plug-in told the agent by itself. It holds texts and no node, so it outlives the plug-in.
struct Event {
    enum class Kind { published, withdrawn, alert };

    Kind kind = Kind::alert;
    std::time_t time = 0;
    std::string path;     ///< of the node concerned
    std::string message;  ///< an alert's text, else the node's description
    // of published and withdrawn nodes
    unsigned int nodeId = 0;
    std::string nodeClass;
    // of alerts
    unsigned int firstCode = 0;
    unsigned int secondCode = 0;
    unsigned int eventCode = 0;
};

/// "published", "withdrawn" or "alert".
const char* eventName(Event::Kind kind);
Event nodeEvent(Event::Kind kind, const IC::Node& node);
Event alertEvent(const IC::Alert& alert);

/// Hears of events. Called on the plug-in's threads, several at once.
class Listener {
public:
    virtual ~Listener() = default;
    virtual void hear(const Event& event) = 0;
};

}  // namespace cvagent
