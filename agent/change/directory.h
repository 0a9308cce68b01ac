#pragma once

#include <string>
#include <vector>

namespace cvagent::change {

/// The names in a directory, sorted, without those of itself and the one above; none when it cannot be read.
/// @param directory a descriptor, be it one that gives no right to read (O_PATH)
std::vector<std::string> namesIn(int directory);
/// What a link leads to; "" when it is none.
std::string targetOf(int directory, const std::string& name);

}  // namespace cvagent::change
