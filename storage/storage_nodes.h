#pragma once

#include "mi/host_node.h"

namespace IC {

// A drive and a partition: their name is the device path, "/dev/sda". All but a health that is always good is
// stored when the node is built; nothing is asked of the host, and writing changes nothing there.

namespace StorageProperty {
enum Id : unsigned int {
    driveSize = 37,         ///< unsigned 64-bit, thousands of bytes; drives only
    devicePath = 89,        ///< text
    partitionName = 108,    ///< text: the device path again; partitions only
    partitionBlocks = 112,  ///< unsigned 64-bit, blocks of 1024 bytes; partitions only
    healthState = 123,      ///< live: always 1
};
}  // namespace StorageProperty

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

}  // namespace IC
