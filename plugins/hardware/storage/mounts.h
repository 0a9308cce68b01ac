#pragma once

#include <string>
#include <vector>

#include "plugins/hardware/host.h"

namespace hardware {

/// One row of mountinfo.
struct Mount {
    std::string number;  ///< "8:1"; "0:…" where the file system has no device of its own
    std::string where;
    std::string type;
    std::string source;
};

/// The mounts of the host, in their order; those of this process where others' may not be read.
std::vector<Mount> mounts(const Host& host);

}  // namespace hardware
