#pragma once

#include <iosfwd>
#include <string>
#include <variant>

#include "framework/export.h"

namespace IC {

/// A numeric value that remembers what kind of number it is. A plain value: copied freely, no lock.
class CORVISTA_API Number {
public:
    enum KindType : unsigned int { none = 0, unsigned32, unsigned64, boolean, real, scaled };

    Number() = default;
    explicit Number(KindType kind) : kind_(kind) {}  ///< an empty value of that kind
    Number(unsigned int value) : kind_(unsigned32), value_(value) {}
    Number(unsigned long long value) : kind_(unsigned64), value_(value) {}
    Number(bool value) : kind_(boolean), value_(value) {}
    Number(double value) : kind_(real), value_(value) {}
    /// value / 10^scale: (12345, 2) is 123.45
    Number(long value, unsigned short scale) : kind_(scaled), value_(Scaled{value, scale}) {}

    KindType kind() const { return kind_; }
    bool empty() const { return std::holds_alternative<std::monostate>(value_); }

    /// The value as 32 bits: a fraction is dropped, a negative value wraps to two's complement, an empty
    /// number is 0. Throws ConversionError when the value does not fit (below -2^31, above 2^32 - 1, not
    /// finite).
    operator unsigned int() const;
    /// The same with 64 bits.
    unsigned long long toUnsigned64() const;
    double toDouble() const;
    /// Decimal text; booleans read "true" and "false", an empty number reads "".
    std::string toString() const;

    friend bool operator==(const Number& left, const Number& right) = default;

private:
    struct Scaled {
        long value;
        unsigned short scale;
        friend bool operator==(const Scaled&, const Scaled&) = default;
    };
    template <class Unsigned>
    Unsigned to() const;

    KindType kind_ = none;
    std::variant<std::monostate, unsigned int, unsigned long long, bool, double, Scaled> value_;
};

CORVISTA_API std::ostream& operator<<(std::ostream& out, const Number& number);

}  // namespace IC
