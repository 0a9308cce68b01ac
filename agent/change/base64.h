#pragma once

#include <optional>
#include <string>
#include <string_view>

namespace cvagent::change {

std::string toBase64(std::string_view bytes);
/// @return nothing for what is no base64 with its padding
std::optional<std::string> fromBase64(std::string_view text);

}  // namespace cvagent::change
