#pragma once

#include <string>
#include <vector>

#include "plugins/hardware/host.h"

namespace hardware {

/// One row of mountinfo.
struct Mount {
    std::string id;
    std::string under;   ///< id of the mount that it is placed on
    std::string number;  ///< "8:1"; "0:…" where the file system has no device of its own
    std::string where;
    std::string type;
    std::string source;
};

/// The mounts of the host in their order: those of the first process, for this one may have others of its
/// own.
std::vector<Mount> mounts(const Host& host);

/// Mounts that this process can go to, and what leads there: those of the first process below "/proc/1/root",
/// or where that is not allowed its own.
struct Within {
    std::vector<Mount> mounts;
    std::string root;
};
Within mountsWithinReach(const Host& host);

/// Whether the path of a mount leads to it, and by no file system whose server could be gone: nothing lies
/// over it.
bool leadsThere(const Mount& mount, const std::vector<Mount>& all);

}  // namespace hardware
