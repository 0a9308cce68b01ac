#pragma once

#include <string>
#include <vector>

#include "agent/core/node_classes.h"

namespace cvagent::service {

/// The properties of a node of that type that news of its link or of the host concern, ascending; what
/// else it has does not follow from them.
/// @param concern a mask of Concern (host_links.h)
std::vector<unsigned int> concernedProperties(unsigned int nodeType, unsigned int concern);

/// Whether it is of a plug-in that hears the news itself and looks again by itself, but does not say what it
/// found. It does so within a second and a bit.
bool looksByItself(const std::string& nodeClass, unsigned int concern, bool drives);

}  // namespace cvagent::service
