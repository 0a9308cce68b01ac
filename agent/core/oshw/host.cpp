// The computer and its processors.
#include "agent/core/oshw/tables.h"
#include "agent/core/value_check.h"

namespace cvagent::oshw {

namespace {

constexpr Label kPower[] = {{"on", 1, true}, {"restart", 9, true, true}, {"halt", 12, true, true}};

constexpr auto kOwnerAccepts = "text of up to 1024 bytes without control characters; \"\" removes it";

constexpr Property kHostRows[] = {
    {NodeType::computer, 108, "HostName", Kind::text, Unit::none, {}, "the host name as the kernel has it"},
    {NodeType::computer,
     115,
     "OwnerContact",
     Kind::text,
     Unit::none,
     {},
     "how to reach the owner; kept in asset.dat of the data directory",
     check::ownerText,
     kOwnerAccepts},
    {NodeType::computer,
     116,
     "OwnerName",
     Kind::text,
     Unit::none,
     {},
     "who owns the computer; kept in asset.dat of the data directory",
     check::ownerText,
     kOwnerAccepts},
    {NodeType::computer, 123, "PowerAction", Kind::enumeration, Unit::none, kPower,
     "writing 9 restarts the host, 12 halts it", check::enumeration},
    {NodeType::computer, 125, "PowerActions", Kind::numbers, Unit::none, kPower, "what PowerAction accepts"},
    {NodeType::computer,
     126,
     "CurrentTime",
     Kind::number,
     Unit::secondsSinceEpoch,
     {},
     "the system clock; writing sets it",
     check::dateTime,
     "a date and time such as 2026-11-20T21:03:00Z, 2026-11-20T22:03:00+01:00 or, in local time, "
     "2026-11-20T22:03:00"},
    {NodeType::computer,
     127,
     "TimeZoneOffset",
     Kind::number,
     Unit::minutes,
     {},
     "minutes east of UTC, daylight saving included; writing switches to the zone that stands for the offset",
     check::timeZoneOffset,
     "an offset in minutes out of "},
    {NodeType::computer, 200, "ComputerConstant200", Kind::number, Unit::none, {}, "always 1"},
    {NodeType::processor,
     80,
     "ClockSpeed",
     Kind::number,
     Unit::megahertz,
     {},
     "the clock speed when the plug-in was loaded"},
};

}  // namespace

std::span<const Property> hostProperties() {
    return kHostRows;
}

}  // namespace cvagent::oshw
