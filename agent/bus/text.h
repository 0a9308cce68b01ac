#pragma once

#include <string>
#include <string_view>

namespace cvagent::bus {

/// Whether the bus takes the bytes for a text: UTF-8 without zeros and without what is no character.
bool isText(std::string_view bytes);
/// The same bytes, but U+FFFD in place of each that keeps them from being one.
std::string asText(std::string_view bytes);
/// The same, and no more of it than an error may hold: one that repeats what a caller sent could be larger
/// than the bus takes, which ends the connection of who sends it.
std::string shortText(std::string_view bytes);

}  // namespace cvagent::bus
