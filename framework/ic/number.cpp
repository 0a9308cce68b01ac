#include "framework/ic/number.h"

#include <array>
#include <charconv>
#include <cmath>
#include <limits>
#include <ostream>

#include "framework/ic/conversion_error.h"

namespace IC {
namespace {

/// The whole part, towards zero. A scale above 19 leaves nothing of any long.
long withoutFraction(long value, unsigned int scale) {
    while (scale-- > 0 && value != 0) {
        value /= 10;
    }
    return value;
}

std::string scaledText(long value, unsigned int scale) {
    std::string digits = std::to_string(value);
    const bool negative = digits.front() == '-';
    if (negative) {
        digits.erase(0, 1);
    }
    if (scale > 0) {
        if (digits.size() <= scale) {
            digits.insert(0, scale - digits.size() + 1, '0');
        }
        digits.insert(digits.size() - scale, 1, '.');
    }
    return negative ? "-" + digits : digits;
}

std::string realText(double value) {
    std::array<char, 64> buffer{};
    const auto end = std::to_chars(buffer.data(), buffer.data() + buffer.size(), value).ptr;
    return {buffer.data(), end};
}

template <class Unsigned>
Unsigned wrapped(const Number& number, long value) {
    if constexpr (sizeof(Unsigned) < sizeof(long)) {
        if (value < std::numeric_limits<std::make_signed_t<Unsigned>>::min() ||
            value > static_cast<long>(std::numeric_limits<Unsigned>::max())) {
            throw ConversionError("number out of range: " + number.toString());
        }
    }
    return static_cast<Unsigned>(value);
}

template <class Unsigned>
Unsigned wrapped(const Number& number, double value) {
    using Signed = std::make_signed_t<Unsigned>;
    const double whole = std::trunc(value);
    // Powers of two are exact as doubles; the greatest values themselves are not.
    const double limit = std::ldexp(1.0, std::numeric_limits<Unsigned>::digits);
    if (!(whole >= -limit / 2 && whole < limit)) {
        throw ConversionError("number out of range: " + number.toString());
    }
    return whole < 0 ? static_cast<Unsigned>(static_cast<Signed>(whole)) : static_cast<Unsigned>(whole);
}

}  // namespace

template <class Unsigned>
Unsigned Number::to() const {
    if (const auto* value = std::get_if<unsigned int>(&value_)) {
        return *value;
    }
    if (const auto* value = std::get_if<unsigned long long>(&value_)) {
        if (*value > std::numeric_limits<Unsigned>::max()) {
            throw ConversionError("number out of range: " + toString());
        }
        return static_cast<Unsigned>(*value);
    }
    if (const auto* value = std::get_if<bool>(&value_)) {
        return *value ? 1 : 0;
    }
    if (const auto* value = std::get_if<double>(&value_)) {
        return wrapped<Unsigned>(*this, *value);
    }
    if (const auto* value = std::get_if<Scaled>(&value_)) {
        return wrapped<Unsigned>(*this, withoutFraction(value->value, value->scale));
    }
    return 0;
}

Number::operator unsigned int() const {
    return to<unsigned int>();
}

unsigned long long Number::toUnsigned64() const {
    return to<unsigned long long>();
}

double Number::toDouble() const {
    if (const auto* value = std::get_if<double>(&value_)) {
        return *value;
    }
    if (const auto* value = std::get_if<Scaled>(&value_)) {
        return static_cast<double>(value->value) / std::pow(10.0, value->scale);
    }
    return static_cast<double>(toUnsigned64());
}

std::string Number::toString() const {
    if (const auto* value = std::get_if<bool>(&value_)) {
        return *value ? "true" : "false";
    }
    if (const auto* value = std::get_if<double>(&value_)) {
        return realText(*value);
    }
    if (const auto* value = std::get_if<Scaled>(&value_)) {
        return scaledText(value->value, value->scale);
    }
    return empty() ? "" : std::to_string(toUnsigned64());
}

std::ostream& operator<<(std::ostream& out, const Number& number) {
    return out << number.toString();
}

}  // namespace IC
