#pragma once

#include <string>
#include <string_view>

namespace cvagent::bus {

/// Whether the bus takes the bytes for a text: UTF-8 without zeros and without what is no character.
bool isText(std::string_view bytes);
/// The same bytes, but U+FFFD in place of each that keeps them from being one.
std::string asText(std::string_view bytes);

}  // namespace cvagent::bus
