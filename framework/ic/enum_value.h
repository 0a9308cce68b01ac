#pragma once

#include <ostream>

namespace IC {

/// One value of an enumeration, known by its code.
class EnumValue {
public:
    EnumValue() = default;
    explicit EnumValue(unsigned int code) : code_(code) {}
    unsigned int code() const { return code_; }
    friend bool operator==(const EnumValue&, const EnumValue&) = default;

private:
    unsigned int code_ = 0;
};

inline std::ostream& operator<<(std::ostream& out, const EnumValue& value) {
    return out << value.code();
}

}  // namespace IC
