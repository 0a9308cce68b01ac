#pragma once

#include <span>
#include <string_view>

namespace hosttools {

/// The words after the tool's name.
using Arguments = std::span<const char* const>;

/// One tool of the multi-call program.
struct Applet {
    const char* name;
    int (*run)(Arguments);
    const char* usage;
};

/// `fdisk -l [DISK...]`: the disks and their partitions. @return the exit status
int runFdisk(Arguments arguments);
/// `ifconfig [-a] [INTERFACE [CHANGE...]]`: the interfaces that are up (-a: all), one, or a change of one.
int runIfconfig(Arguments arguments);
/// `route [-A inet6] -n`: the routing tables; `route add|del ...`: a change of an IPv4 route.
int runRoute(Arguments arguments);

}  // namespace hosttools
