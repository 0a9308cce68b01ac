#pragma once

#include "mi/host_node.h"

namespace IC {

// The name of a drive and of a partition is the device path, "/dev/sda". All but their health is stored when
// the node is built; writing changes nothing on the host.

extern const NodeClass hardDriveClass;
extern const NodeClass diskPartitionClass;

/// A hard drive: a "Disk" line of the disk snapshot.
class HardDriveNode : public NodeOf<hardDriveClass> {
public:
    using NodeOf::NodeOf;
};

/// A partition: a "/dev" line of the disk snapshot.
class DiskPartition : public NodeOf<diskPartitionClass> {
public:
    using NodeOf::NodeOf;
};

/// A device that is listed counts as healthy, 1: the listing says nothing more about it.
inline PropertyValue healthOf(const std::string& /*device*/) {
    return {Number(1U), true};
}

}  // namespace IC
