#include "agent/core/value_check.h"

#include <algorithm>
#include <cctype>
#include <charconv>
#include <stdexcept>

#include "framework/qx/date_time.h"
#include "framework/qx/zone_table.h"

namespace cvagent::check {

namespace {

constexpr std::size_t kLongestOwnerText = 1024;
constexpr std::size_t kLongestDateTime = 40;

/// A decimal number as a person writes it: ASCII digits, a minus, nothing else, no needless zeros.
template <class Number>
std::optional<Number> decimal(const std::string& text) {
    Number number{};
    const char* end = text.data() + text.size();
    const auto [stop, error] = std::from_chars(text.data(), end, number);
    const bool whole = !text.empty() && error == std::errc() && stop == end;
    return whole && std::to_string(number) == text ? std::optional(number) : std::nullopt;
}

bool sameWord(const std::string& left, const char* right) {
    const std::string other = right;
    return std::equal(left.begin(), left.end(), other.begin(), other.end(),
                      [](unsigned char a, unsigned char b) { return std::tolower(a) == std::tolower(b); });
}

std::optional<unsigned int> writableCode(const Property& property, Words words) {
    if (words.size() != 1) {
        return std::nullopt;
    }
    const std::optional<unsigned int> number = decimal<unsigned int>(words.front());
    for (const Label& label : property.labels) {
        if (label.writable && (number == label.code || sameWord(words.front(), label.text))) {
            return label.code;
        }
    }
    return std::nullopt;
}

/// The length of the UTF-8 sequence that begins with `lead`; 0 when none can.
std::size_t sequenceLength(unsigned char lead) {
    if (lead < 0x80) return 1;
    if (lead >= 0xC2 && lead < 0xE0) return 2;
    if (lead >= 0xE0 && lead < 0xF0) return 3;
    if (lead >= 0xF0 && lead < 0xF5) return 4;
    return 0;
}

/// The next character of UTF-8 text; nothing when it is damaged. Advances `at`.
std::optional<char32_t> nextCharacter(const std::string& text, std::size_t& at) {
    constexpr char32_t smallest[] = {0, 0, 0x80, 0x800, 0x10000};
    const auto byte = [&text](std::size_t i) { return static_cast<unsigned char>(text[i]); };
    const std::size_t length = sequenceLength(byte(at));
    if (length == 0 || at + length > text.size()) {
        return std::nullopt;
    }
    char32_t character = length == 1 ? byte(at) : byte(at) & (0x7FU >> length);
    for (std::size_t i = 1; i < length; ++i) {
        if ((byte(at + i) & 0xC0U) != 0x80U) {
            return std::nullopt;
        }
        character = (character << 6U) | (byte(at + i) & 0x3FU);
    }
    at += length;
    const bool surrogate = character >= 0xD800 && character <= 0xDFFF;
    const bool valid = character >= smallest[length] && character <= 0x10FFFF && !surrogate;
    return valid ? std::optional(character) : std::nullopt;
}

/// Control characters, line and paragraph separators, and those that turn the direction of writing.
bool isControl(char32_t character) {
    return character < 0x20 || (character >= 0x7F && character < 0xA0) || character == 0x2028 ||
           character == 0x2029 || (character >= 0x202A && character <= 0x202E) ||
           (character >= 0x2066 && character <= 0x2069);
}

bool isPlainText(const std::string& text) {
    for (std::size_t at = 0; at < text.size();) {
        const std::optional<char32_t> character = nextCharacter(text, at);
        if (!character || isControl(*character)) {
            return false;
        }
    }
    return true;
}

bool isDateTime(const std::string& text) {
    return text.size() <= kLongestDateTime && text.find_first_not_of("0123456789-+:TZ") == std::string::npos;
}

}  // namespace

Value enumeration(const Property& property, Words words) {
    const auto code = writableCode(property, words);
    return code ? Value(IC::PropertyValue(IC::EnumValue(*code), true)) : std::nullopt;
}

Value code(const Property& property, Words words) {
    const auto code = writableCode(property, words);
    return code ? Value(IC::PropertyValue(IC::Number(*code), true)) : std::nullopt;
}

Value ownerText(const Property& /*property*/, Words words) {
    const bool good =
        words.size() == 1 && words.front().size() <= kLongestOwnerText && isPlainText(words.front());
    return good ? Value(IC::PropertyValue(words.front(), true)) : std::nullopt;
}

Value dateTime(const Property& /*property*/, Words words) {
    if (words.size() != 1 || !isDateTime(words.front())) {
        return std::nullopt;
    }
    try {
        // The conversion tells whether this platform's clock holds the time.
        [[maybe_unused]] const long seconds = QX::DateTime(words.front(), 3);
        return IC::PropertyValue(words.front(), true);
    } catch (const std::exception&) {
        return std::nullopt;
    }
}

Value timeZoneOffset(const Property& /*property*/, Words words) {
    const auto offset = words.size() == 1 ? decimal<int>(words.front()) : std::nullopt;
    const bool known = offset && QX::findZone(static_cast<unsigned int>(*offset)) != nullptr;
    // A scaled number keeps the sign that an unsigned one would lose in log lines.
    return known ? Value(IC::PropertyValue(IC::Number(static_cast<long>(*offset), 0), true)) : std::nullopt;
}

}  // namespace cvagent::check
