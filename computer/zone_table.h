#pragma once

namespace IC {

/// The one zone that stands for an offset from UTC.
struct Zone {
    int offset;        ///< minutes, east of UTC positive
    const char* file;  ///< below /usr/share/zoneinfo
    const char* name;  ///< the text of the TIMEZONE key in /etc/sysconfig/clock
};

/// @param offset minutes; west of UTC in two's complement
/// @return null for an offset that no zone stands for
const Zone* findZone(unsigned int offset);

}  // namespace IC
