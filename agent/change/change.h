#pragma once

#include <string>
#include <vector>

namespace cvagent::change {

/// One value that is to be set, in a person's words; what they mean is found out where the change is tried or
/// made.
struct Change {
    std::string node;  ///< a path, or whatever names one node
    unsigned int property = 0;
    std::vector<std::string> words;  ///< as acceptedValue takes them (agent/core/property_words.h)
};

}  // namespace cvagent::change
