#pragma once

#include <iosfwd>
#include <string>
#include <variant>
#include <vector>

#include "framework/export.h"
#include "framework/ic/conversion_error.h"
#include "framework/ic/enum_value.h"
#include "framework/ic/number.h"

namespace IC {

/// The tagged value a property holds. A plain value: copied freely, no lock.
class CORVISTA_API PropertyValue {
public:
    enum KindType : unsigned int { none = 0, number, text, enumeration, texts, numbers };

    // `known` says that the value is known, as opposed to a place-holder the host could not fill.
    PropertyValue() = default;
    PropertyValue(KindType kind, const bool& known) : kind_(kind), known_(known) {}  ///< empty, of that kind
    PropertyValue(const Number& value, const bool& known) : kind_(number), known_(known), value_(value) {}
    PropertyValue(const std::string& value, const bool& known) : kind_(text), known_(known), value_(value) {}
    PropertyValue(const char* value, const bool& known)
        : kind_(text), known_(known), value_(std::string(value ? value : "")) {}
    PropertyValue(const EnumValue& value, const bool& known)
        : kind_(enumeration), known_(known), value_(value) {}
    PropertyValue(const std::vector<std::string>& value, const bool& known)
        : kind_(texts), known_(known), value_(value) {}
    PropertyValue(const std::vector<Number>& value, const bool& known)
        : kind_(numbers), known_(known), value_(value) {}
    /// Assigned, not initialised: a variant of libstdc++ 12 whose copy finds no memory destroys what it never
    /// made.
    PropertyValue(const PropertyValue& other) : kind_(other.kind_), known_(other.known_) {
        value_ = other.value_;
    }
    PropertyValue(PropertyValue&& other) = default;
    PropertyValue& operator=(const PropertyValue& other) = default;
    PropertyValue& operator=(PropertyValue&& other) = default;
    ~PropertyValue() = default;

    KindType kind() const { return kind_; }
    bool known() const { return known_; }
    /// True when the value holds nothing: of kind `none`, or built from a kind alone.
    bool empty() const { return std::holds_alternative<std::monostate>(value_); }

    /// A number, an enumeration's code, or a text that is wholly a decimal number (a leading '-' wraps to
    /// two's complement). Throws ConversionError for anything else, an empty value included.
    explicit operator unsigned int() const;
    /// The printable text: lists are joined with one blank, an empty value is "".
    explicit operator std::string() const;
    /// A list of texts as it is, a text as a list of one, an empty value as an empty list. Throws
    /// ConversionError for numbers and enumerations.
    explicit operator std::vector<std::string>() const;

    /// Typed views for readers that look at the kind first; null when the value is of another type.
    const Number* asNumber() const { return std::get_if<Number>(&value_); }
    const std::string* asText() const { return std::get_if<std::string>(&value_); }
    const EnumValue* asEnum() const { return std::get_if<EnumValue>(&value_); }
    const std::vector<std::string>* asTexts() const { return std::get_if<std::vector<std::string>>(&value_); }
    const std::vector<Number>* asNumbers() const { return std::get_if<std::vector<Number>>(&value_); }

private:
    friend CORVISTA_API bool operator==(const PropertyValue& left, const PropertyValue& right);

    KindType kind_ = none;
    bool known_ = false;
    std::variant<std::monostate, Number, std::string, EnumValue, std::vector<std::string>,
                 std::vector<Number>>
        value_;
};

/// Equal kind and equal content; whether the value is known does not count.
CORVISTA_API bool operator==(const PropertyValue& left, const PropertyValue& right);
CORVISTA_API std::ostream& operator<<(std::ostream& out, const PropertyValue& value);

}  // namespace IC
