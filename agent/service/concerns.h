#pragma once

#include <vector>

#include "agent/core/node_classes.h"

namespace cvagent::service {

/// The properties of a node of that type that news of its link concern, ascending; what else it has does not
/// follow from what the kernel announces.
/// @param concern a mask of Concern (host_links.h)
std::vector<unsigned int> concernedProperties(unsigned int nodeType, unsigned int concern);

}  // namespace cvagent::service
