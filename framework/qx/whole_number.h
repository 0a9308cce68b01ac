#pragma once

#include <charconv>
#include <optional>
#include <string_view>
#include <system_error>

namespace QX {

/// The number that is the whole of a text: digits of the base and, where the type has one, a minus; no sign
/// else, no blank, no prefix. Nothing when it is anything else or too large for the type.
template <class Number>
std::optional<Number> wholeNumber(std::string_view text, int base = 10) {
    Number number{};
    const char* const end = text.data() + text.size();
    const auto [stop, error] = std::from_chars(text.data(), end, number, base);
    return error == std::errc() && stop == end ? std::optional(number) : std::nullopt;
}

}  // namespace QX
