#include "agent/core/text.h"

#include <algorithm>
#include <array>

#include "framework/qx/utf8.h"

namespace cvagent {

namespace {

constexpr std::size_t kLongestQuote = 60;

std::string spelt(char byte) {
    constexpr const char* kDigits = "0123456789abcdef";
    const auto value = static_cast<unsigned char>(byte);
    return {'\\', 'x', kDigits[value / 16], kDigits[value % 16]};
}

}  // namespace

bool isControl(char32_t character) {
    return character < 0x20 || (character >= 0x7F && character < 0xA0) || character == 0x2028 ||
           character == 0x2029 || (character >= 0x202A && character <= 0x202E) ||
           (character >= 0x2066 && character <= 0x2069);
}

std::string printable(const std::string& text) {
    if (std::ranges::all_of(text, [](char byte) { return byte >= ' ' && byte <= '~'; })) {
        return text;
    }
    std::string shown;
    for (std::size_t i = 0; i < text.size();) {
        const QX::Utf8Character next = QX::firstUtf8Character(std::string_view(text).substr(i));
        if (next.length != 0 && !isControl(next.code)) {
            shown.append(text, i, next.length);
            i += next.length;
        } else {
            shown += spelt(text[i]);
            ++i;
        }
    }
    return shown;
}

std::string inQuotes(const std::string& text) {
    if (text.size() <= kLongestQuote) {
        return "'" + printable(text) + "'";
    }
    std::size_t length = kLongestQuote;
    while (length > 0 && (static_cast<unsigned char>(text[length]) & 0xC0U) == 0x80U) {
        --length;  // no half characters
    }
    return "'" + printable(text.substr(0, length)) + "...' (" + std::to_string(text.size()) + " bytes)";
}

std::string timeText(std::time_t time) {
    std::tm fields{};
    std::array<char, 40> text{};
    if (gmtime_r(&time, &fields) == nullptr ||
        std::strftime(text.data(), text.size(), "%Y-%m-%dT%H:%M:%SZ", &fields) == 0) {
        return std::to_string(time) + " s since 1970";
    }
    return text.data();
}

}  // namespace cvagent
