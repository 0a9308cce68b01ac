#pragma once

#include <string_view>

#include "framework/ic/property_value.h"

namespace IC {

/// Where an interface has its IPv4 address from, as the agent counts it.
namespace IPOrigin {
constexpr unsigned int dhcp = 1;
constexpr unsigned int bootp = 2;
constexpr unsigned int fixed = 3;  ///< written in the interface's file
}  // namespace IPOrigin

/// The IPOrigin code of a BOOTPROTO keyword; 0 for any other.
inline unsigned int originOfKeyword(std::string_view keyword) {
    if (keyword == "dhcp" || keyword == "dhcp4") {
        return IPOrigin::dhcp;
    }
    if (keyword == "static" || keyword == "none") {
        return IPOrigin::fixed;
    }
    return keyword == "bootp" ? IPOrigin::bootp : 0;
}

/// The IPOrigin code in a value; 0, which is no origin, when the value is not a number. Never throws.
inline unsigned int originCode(const PropertyValue& origin) {
    try {
        return static_cast<unsigned int>(origin);
    } catch (const ConversionError&) {
        return 0;
    }
}

}  // namespace IC
