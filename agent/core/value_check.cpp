#include "agent/core/value_check.h"

#include <algorithm>
#include <cctype>
#include <stdexcept>
#include <string_view>

#include "agent/core/text.h"
#include "framework/qx/date_time.h"
#include "framework/qx/utf8.h"
#include "framework/qx/whole_number.h"
#include "framework/qx/zone_table.h"

namespace cvagent::check {

namespace {

constexpr std::size_t kLongestOwnerText = 1024;
constexpr std::size_t kLongestDateTime = 40;

/// A number as a person writes it: no needless zeros.
template <class Number>
std::optional<Number> decimal(const std::string& text) {
    const auto number = QX::wholeNumber<Number>(text);
    return number && std::to_string(*number) == text ? number : std::nullopt;
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

bool isPlainText(std::string_view text) {
    while (!text.empty()) {
        const QX::Utf8Character next = QX::firstUtf8Character(text);
        if (next.length == 0 || isControl(next.code)) {
            return false;
        }
        text.remove_prefix(next.length);
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
