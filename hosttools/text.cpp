#include "hosttools/text.h"

#include <unistd.h>
#include <cerrno>
#include <charconv>

namespace hosttools {
namespace {

template <typename Number>
void appendNumber(std::string& text, Number value, int base) {
    char digits[24];
    const auto end = std::to_chars(digits, digits + sizeof digits, value, base);
    text.append(digits, end.ptr);
}

}  // namespace

Text& Text::add(std::string_view text) {
    text_ += text;
    return *this;
}

Text& Text::add(char letter) {
    text_ += letter;
    return *this;
}

Text& Text::number(std::uint64_t value) {
    appendNumber(text_, value, 10);
    return *this;
}

Text& Text::number(std::int64_t value) {
    appendNumber(text_, value, 10);
    return *this;
}

Text& Text::hex(std::uint64_t value, std::size_t digits) {
    const std::size_t mark = size();
    appendNumber(text_, value, 16);
    if (size() - mark < digits) text_.insert(mark, digits - (size() - mark), '0');
    return *this;
}

Text& Text::padLeftAligned(std::size_t mark, std::size_t width) {
    if (size() - mark < width) text_.append(width - (size() - mark), ' ');
    return *this;
}

Text& Text::padRightAligned(std::size_t mark, std::size_t width) {
    if (size() - mark < width) text_.insert(mark, width - (size() - mark), ' ');
    return *this;
}

Text& Text::left(std::string_view text, std::size_t width) {
    const std::size_t mark = size();
    return add(text).padLeftAligned(mark, width);
}

Text& Text::right(std::string_view text, std::size_t width) {
    const std::size_t mark = size();
    return add(text).padRightAligned(mark, width);
}

Text& Text::right(std::uint64_t value, std::size_t width) {
    const std::size_t mark = size();
    return number(value).padRightAligned(mark, width);
}

bool writeAll(int descriptor, std::string_view text) {
    while (!text.empty()) {
        const ssize_t written = write(descriptor, text.data(), text.size());
        if (written < 0 && errno == EINTR) continue;
        if (written <= 0) return false;
        text.remove_prefix(static_cast<std::size_t>(written));
    }
    return true;
}

}  // namespace hosttools
