#pragma once

#include <algorithm>
#include <iterator>

namespace QX {

/// The one zone that stands for an offset from UTC, on hosts and for the agent that is to set one.
struct Zone {
    int offset;        ///< minutes, east of UTC positive
    const char* file;  ///< below /usr/share/zoneinfo
    const char* name;  ///< the text of the TIMEZONE key in /etc/sysconfig/clock
};

// Which zone stands for an offset that several share (Brisbane, not Sydney) is a choice that hosts rely on.
// The key's text is not always the file's name: the classic abbreviations are what the host's own tools
// write.
inline constexpr Zone zoneTable[] = {
    {-660, "Pacific/Midway", "Pacific/Midway"},
    {-600, "HST", "HST"},
    {-540, "America/Anchorage", "America/Anchorage"},
    {-480, "PST8PDT", "PST"},
    {-420, "MST7MDT", "MST"},
    {-360, "CST6CDT", "CST"},
    {-300, "EST5EDT", "EST"},
    {-240, "America/Halifax", "America/Halifax"},
    {-210, "America/St_Johns", "America/St_Johns"},
    {-180, "America/Godthab", "America/Godthab"},
    {-120, "Atlantic/South_Georgia", "Atlantic/South_Georgia"},
    {-60, "Atlantic/Azores", "Atlantic/Azores"},
    {0, "GMT", "GMT"},
    {60, "CET", "CET"},
    {120, "EET", "EET"},
    {180, "Europe/Moscow", "Europe/Moscow"},
    {210, "Asia/Tehran", "Asia/Tehran"},
    {240, "Europe/Samara", "Europe/Samara"},
    {270, "Asia/Kabul", "Asia/Kabul"},
    {300, "Asia/Yekaterinburg", "Asia/Yekaterinburg"},
    {330, "Asia/Kolkata", "Asia/Kolkata"},
    {360, "Asia/Omsk", "Asia/Omsk"},
    {420, "Asia/Jakarta", "Asia/Jakarta"},
    {480, "Australia/Perth", "Australia/Perth"},
    {540, "Japan", "JST"},
    {570, "Australia/Adelaide", "Australia/Adelaide"},
    {600, "Australia/Brisbane", "Australia/Brisbane"},
    {660, "Asia/Magadan", "Asia/Magadan"},
    {720, "Asia/Kamchatka", "Asia/Kamchatka"},
};
static_assert(std::ranges::adjacent_find(zoneTable, std::ranges::greater_equal{}, &Zone::offset) ==
              std::end(zoneTable));

/// @param offset minutes; west of UTC in two's complement
/// @return null for an offset that no zone stands for
constexpr const Zone* findZone(unsigned int offset) {
    const auto* zone = std::ranges::find(
        zoneTable, offset, [](const Zone& entry) { return static_cast<unsigned int>(entry.offset); });
    return zone == std::end(zoneTable) ? nullptr : zone;
}

}  // namespace QX
