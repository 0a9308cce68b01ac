#pragma once

#include <string>
#include <string_view>

#include "hosttools/interfaces.h"

namespace hosttools {

/// Whether a name is one of those that wired interfaces classically have: "eth", "bond" or "usb" is in it.
bool isClassicName(std::string_view name);

/// The lines of /proc/net/dev, in its order and as they stand there, of Ethernet hardware, VLANs, bonds, USB
/// links and veths, whatever they are called. Interfaces of other kinds (a macvlan, a dummy) are listed when
/// their name is a classic one. Never listed: wireless interfaces, tunnels, and veths that are a bridge's
/// member, which are the host's end of a container's cable.
/// @param devices the text of /proc/net/dev
/// @param sysfs the directory with one directory for each interface
/// @param known what netlink tells of them; an interface that is not among them is judged by sysfs alone
std::string wiredLines(std::string_view devices, const std::string& sysfs, const Interfaces& known);

/// @return whether the classic names find every one of the wired interfaces
bool haveClassicNames(std::string_view devices, const std::string& sysfs, const Interfaces& known);
/// The same of this host, now. What cannot be read counts as classic.
bool haveClassicNames();

}  // namespace hosttools
