#pragma once

#include <cstddef>
#include <cstdint>
#include <string>
#include <string_view>

namespace hosttools {

/// The output of a tool, built in memory and written at once: no stream, no locale, and a reader at the other
/// end of a pipe never sees half a listing of a tool that failed on the way.
class Text {
public:
    Text& add(std::string_view text);
    Text& add(char letter);
    Text& number(std::uint64_t value);
    Text& number(std::int64_t value);
    Text& number(unsigned value) { return number(std::uint64_t{value}); }
    Text& number(int value) { return number(std::int64_t{value}); }
    /// Lower-case hexadecimal, with zeros in front up to digits.
    Text& hex(std::uint64_t value, std::size_t digits = 1);
    /// Pads what follows mark (an earlier size()) with blanks on its right up to width.
    Text& padLeftAligned(std::size_t mark, std::size_t width);
    /// The same with the blanks on its left.
    Text& padRightAligned(std::size_t mark, std::size_t width);
    Text& left(std::string_view text, std::size_t width);
    Text& right(std::string_view text, std::size_t width);
    Text& right(std::uint64_t value, std::size_t width);

    std::size_t size() const { return text_.size(); }
    const std::string& str() const { return text_; }
    operator std::string_view() const { return text_; }

private:
    std::string text_;
};

/// Writes the whole text to a descriptor. @return whether all of it went out
bool writeAll(int descriptor, std::string_view text);

}  // namespace hosttools
