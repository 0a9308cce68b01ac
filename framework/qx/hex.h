#pragma once

#include <string_view>

namespace QX {

inline constexpr std::string_view kHexDigits = "0123456789abcdef";

}  // namespace QX
