#include "agent/change/base64.h"

#include <cstdint>

namespace cvagent::change {

namespace {

constexpr std::string_view kDigits = "ABCDEFGHIJKLMNOPQRSTUVWXYZabcdefghijklmnopqrstuvwxyz0123456789+/";
constexpr std::size_t kBytes = 3;  // of a group
constexpr std::size_t kDigitsOf = 4;

std::uint32_t byteAt(std::string_view bytes, std::size_t at) {
    return at < bytes.size() ? static_cast<unsigned char>(bytes[at]) : 0;
}

}  // namespace

std::string toBase64(std::string_view bytes) {
    std::string text;
    for (std::size_t at = 0; at < bytes.size(); at += kBytes) {
        const std::uint32_t group =
            byteAt(bytes, at) << 16U | byteAt(bytes, at + 1) << 8U | byteAt(bytes, at + 2);
        for (unsigned digit = 0; digit < kDigitsOf; ++digit) {
            const bool padding = at + digit > bytes.size();
            text += padding ? '=' : kDigits[group >> (18U - 6U * digit) & 63U];
        }
    }
    return text;
}

std::optional<std::string> fromBase64(std::string_view text) {
    if (text.size() % kDigitsOf != 0) {
        return std::nullopt;
    }
    std::string bytes;
    const std::size_t padding = text.ends_with("==") ? 2 : text.ends_with('=') ? 1 : 0;
    std::uint32_t group = 0;
    for (std::size_t at = 0; at < text.size(); ++at) {
        const std::size_t digit = at < text.size() - padding ? kDigits.find(text[at]) : 0;
        if (digit == std::string_view::npos) {
            return std::nullopt;
        }
        group = group << 6U | static_cast<std::uint32_t>(digit);
        if (at % kDigitsOf == kDigitsOf - 1) {
            bytes += {static_cast<char>(group >> 16U & 255U), static_cast<char>(group >> 8U & 255U),
                      static_cast<char>(group & 255U)};
        }
    }
    bytes.resize(bytes.size() - padding);
    return bytes;
}

}  // namespace cvagent::change
