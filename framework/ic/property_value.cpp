#include "framework/ic/property_value.h"

#include <limits>
#include <ostream>

#include "framework/qx/whole_number.h"

namespace IC {
namespace {

unsigned int parseUnsigned(const std::string& text) {
    const auto value = QX::wholeNumber<long long>(text);
    if (!value || *value < std::numeric_limits<int>::min() ||
        *value > std::numeric_limits<unsigned int>::max()) {
        throw ConversionError("not a number of 32 bits: \"" + text + "\"");
    }
    return static_cast<unsigned int>(*value);
}

const std::string& textOf(const std::string& text) {
    return text;
}

std::string textOf(const Number& number) {
    return number.toString();
}

template <class Item>
std::string joined(const std::vector<Item>& items) {
    std::string text;
    for (const Item& item : items) {
        if (&item != &items.front()) {
            text += ' ';
        }
        text += textOf(item);
    }
    return text;
}

}  // namespace

PropertyValue::operator unsigned int() const {
    if (const Number* value = asNumber()) {
        return *value;
    }
    if (const EnumValue* value = asEnum()) {
        return value->code();
    }
    if (const std::string* value = asText()) {
        return parseUnsigned(*value);
    }
    throw ConversionError(empty() ? "no value" : "a list is not a number");
}

PropertyValue::operator std::string() const {
    if (const std::string* value = asText()) {
        return *value;
    }
    if (const Number* value = asNumber()) {
        return value->toString();
    }
    if (const EnumValue* value = asEnum()) {
        return std::to_string(value->code());
    }
    if (const auto* values = asTexts()) {
        return joined(*values);
    }
    const auto* values = asNumbers();
    return values ? joined(*values) : "";
}

PropertyValue::operator std::vector<std::string>() const {
    if (const auto* values = asTexts()) {
        return *values;
    }
    if (const std::string* value = asText()) {
        return {*value};
    }
    if (empty()) {
        return {};
    }
    throw ConversionError("not a list of texts: " + static_cast<std::string>(*this));
}

bool operator==(const PropertyValue& left, const PropertyValue& right) {
    return left.kind_ == right.kind_ && left.value_ == right.value_;
}

std::ostream& operator<<(std::ostream& out, const PropertyValue& value) {
    return out << static_cast<std::string>(value);
}

}  // namespace IC
