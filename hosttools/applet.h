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

}  // namespace hosttools
