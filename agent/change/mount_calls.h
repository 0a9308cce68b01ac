#pragma once

#include <string>
#include <utility>
#include <vector>

#include "hosttools/descriptor.h"

/// Mounts as descriptors, which need no place to be made at.
namespace cvagent::change {

using MountOptions = std::vector<std::pair<std::string, std::string>>;  // without a value: a flag

/// A file system that is mounted nowhere yet; not open when the kernel refuses it, with errno.
hosttools::Descriptor newMount(const char* type, const MountOptions& options, unsigned attributes = 0);
/// A second view of a directory or file, without what is mounted below it.
hosttools::Descriptor sameAgain(const std::string& path);
/// Puts a mount in its place. @return whether it could
bool attach(const hosttools::Descriptor& mount, const std::string& path);
/// Takes rights away from a mount and all below it. @return whether it could
bool restrict(const std::string& path, unsigned attributes);

struct MountPoint {
    std::string path;
    std::string root;  ///< what of its file system is shown
    std::string type;
};
/// The mounts of this process, in their order.
std::vector<MountPoint> mountPoints();

}  // namespace cvagent::change
