#pragma once

#include <optional>
#include <vector>

#include "agent/core/node_classes.h"

/// What the OS/hardware plug-in asks the host for once, when it makes a node, and tells from its store ever
/// after. An agent that runs for long asks again, by the commands that the plug-in has for it.
namespace cvagent::oshw {

/// The properties of the node of which that is so, ascending; none of a node that another plug-in made.
std::vector<unsigned int> startFacts(const IC::MutableNode& node);
/// What the host tells of one of them now, on the calling thread; a value of no kind when it tells nothing.
/// @return nothing when it is none of them, or the node's name is more than a name to a shell
std::optional<IC::PropertyValue> askStartFact(const IC::MutableNode& node, unsigned int id);

}  // namespace cvagent::oshw
