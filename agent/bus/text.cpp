#include "agent/bus/text.h"

#include <algorithm>
#include <cstddef>

namespace cvagent::bus {

namespace {

constexpr std::string_view kReplacement = "\xEF\xBF\xBD";

/// What the first byte of a sequence says of it.
struct Lead {
    std::size_t length;  ///< 0: it begins none
    char32_t bits;
    char32_t least;  ///< smaller ones are written shorter
};

Lead leadOf(unsigned char byte) {
    constexpr char32_t kFirstOfTwo = 0x80;
    constexpr char32_t kFirstOfThree = 0x800;
    constexpr char32_t kFirstOfFour = 0x10000;
    if (byte < 0x80) {
        return {1, byte, 1};  // from 1: a zero ends a text
    }
    if (byte >= 0xC0 && byte < 0xE0) {
        return {2, byte & 0x1FU, kFirstOfTwo};
    }
    if (byte >= 0xE0 && byte < 0xF0) {
        return {3, byte & 0x0FU, kFirstOfThree};
    }
    if (byte >= 0xF0 && byte < 0xF8) {
        return {4, byte & 0x07U, kFirstOfFour};
    }
    return {0, 0, 0};
}

bool isCharacter(char32_t code) {
    const bool surrogate = code >= 0xD800 && code <= 0xDFFF;
    const bool none = (code >= 0xFDD0 && code <= 0xFDEF) || (code & 0xFFFEU) == 0xFFFE;
    return code <= 0x10FFFF && !surrogate && !none;
}

/// How many bytes the character at the front has; 0 when there is none.
std::size_t characterLength(std::string_view bytes) {
    const Lead lead = leadOf(static_cast<unsigned char>(bytes.front()));
    if (lead.length == 0 || lead.length > bytes.size()) {
        return 0;
    }
    char32_t code = lead.bits;
    for (std::size_t i = 1; i < lead.length; ++i) {
        const auto byte = static_cast<unsigned char>(bytes[i]);
        if ((byte & 0xC0U) != 0x80) {
            return 0;
        }
        code = (code << 6U) | (byte & 0x3FU);
    }
    return code >= lead.least && isCharacter(code) ? lead.length : 0;
}

}  // namespace

bool isText(std::string_view bytes) {
    while (!bytes.empty()) {
        const std::size_t length = characterLength(bytes);
        if (length == 0) {
            return false;
        }
        bytes.remove_prefix(length);
    }
    return true;
}

std::string asText(std::string_view bytes) {
    std::string text;
    while (!bytes.empty()) {
        const std::size_t length = characterLength(bytes);
        text += length == 0 ? kReplacement : bytes.substr(0, length);
        bytes.remove_prefix(std::max<std::size_t>(length, 1));
    }
    return text;
}

std::string shortText(std::string_view bytes) {
    constexpr std::size_t kMost = std::size_t{64} << 10U;
    return bytes.size() <= kMost ? asText(bytes) : asText(bytes.substr(0, kMost)) + "...";
}

}  // namespace cvagent::bus
