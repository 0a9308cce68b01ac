#pragma once

#include <string>
#include <string_view>

namespace cvagent::change {

/// The differences of two texts in the unified format, with three lines around each, without the two lines of
/// names; "" for equal texts. A line is told as it is but for what cannot be printed, which is spelt out.
std::string unifiedDiff(std::string_view before, std::string_view after);

}  // namespace cvagent::change
