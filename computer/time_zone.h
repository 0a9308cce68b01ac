#pragma once

namespace IC {

/// Switches the host to the zone that stands for an offset: the TIMEZONE line of /etc/sysconfig/clock and the
/// link /etc/localtime. The old /etc/localtime stays behind as /etc/localtime.bak.
/// @param offset minutes from UTC, east positive, west in two's complement
/// @return false when no zone stands for the offset (nothing is touched), or when the link could not be made;
///         then the old /etc/localtime is put back if that can be done, the clock file stays rewritten
bool setTimezone(unsigned int offset);

/// Sets the mode of the hardware clock: the first HWCLOCK line of /etc/sysconfig/clock.
/// @param utc true: "-u", the clock runs in UTC; false: "--localtime"
/// @return whether there was such a line and it was replaced; none is added
bool setAutoDSTEnabled(bool utc);

}  // namespace IC
