#pragma once

#include <cstdint>
#include <ctime>
#include <string>
#include <vector>

#include "agent/core/node_classes.h"
#include "framework/ic/alert.h"
#include "framework/ic/node.h"

namespace cvagent {

/// Something that happened in the tree: the plug-in told it by itself, or a write brought it about. It holds
/// texts and no node, so it outlives the plug-in.
struct Event {
    /// "changed": a property that nobody has written through this agent has another value.
    enum class Kind { published, withdrawn, alert, written, changed };

    std::uint64_t number = 0;  ///< given by the agent in the order of events, from 1; 0: not yet
    Kind kind = Kind::alert;
    std::time_t time = 0;
    std::string path;     ///< of the node concerned
    std::string message;  ///< an alert's text, else the node's description
    // of the node; an alert about a node that is not listed has none
    unsigned int nodeId = 0;
    std::string nodeClass;
    // of written and changed properties, and of alerts about one
    unsigned int property = 0;
    std::string propertyName;  ///< empty: the event is about no property
    std::string before;        ///< the value as text; empty when it is not known
    std::string after;
    // of writes
    std::string caller;   ///< who has written; empty for what nobody asked for
    std::string wanted;   ///< the value that was to be, as text
    std::string verdict;  ///< "applied", "differs", "unknown" or "failed"; behind a colon the reason
    std::string plan;     ///< of the change that the write belongs to, as JSON; empty where there is none
    // of alerts
    unsigned int firstCode = 0;
    unsigned int secondCode = 0;
    unsigned int eventCode = 0;
};

constexpr std::size_t kEventKinds = 5;

/// "published", "withdrawn", "alert", "written" or "changed".
const char* eventName(Event::Kind kind);
Event nodeEvent(Event::Kind kind, const IC::Node& node);
/// @param nodes the listed ones, to find the one that the alert is about
Event alertEvent(const IC::Alert& alert, const std::vector<Handle>& nodes = {});

/// Hears of events. Called on the plug-in's threads, several at once.
class Listener {
public:
    virtual ~Listener() = default;
    virtual void hear(const Event& event) = 0;
};

}  // namespace cvagent
