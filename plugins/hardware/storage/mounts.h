#pragma once

#include <set>
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

/// The mounts of the host in their order, and whose they are.
struct Mounts {
    std::vector<Mount> all;
    /// What leads to them from here: the mounts are those of the first process, and this one may see others.
    /// "" where only those of this process may be read.
    std::string root;
};

Mounts mounts(const Host& host);

/// Whether the path of a mount leads to it, and by no file system whose server could be gone: nothing lies
/// over it.
bool isWithinReach(const Mount& mount, const std::vector<Mount>& all);

}  // namespace hardware
