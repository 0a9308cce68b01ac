#pragma once

#include <string>
#include <vector>

#include "framework/ic/mutable_node.h"

namespace IC {

/// What a drive and a partition share: the device they stand for, and a health that is always good. All else
/// is stored when the node is built; nothing is asked of the host, and writing changes nothing there.
class StorageNode : public MutableNode {
public:
    enum PropertyId : unsigned int {
        devicePath = 89,    ///< text
        healthState = 123,  ///< live: always 1
    };

    /// Status 0 with 1 for healthState; any other id as it was stored last.
    Error getProperty(unsigned int id, PropertyValue& out) const override;

    /// The device path, e.g. "/dev/sda".
    const std::string& name() const { return name_; }

protected:
    /// Arguments as for MutableNode.
    /// @param index counts the nodes of one build, from 1
    /// @param name  the device path
    StorageNode(unsigned int nodeId, unsigned int linkedId, std::vector<unsigned int> miIds,
                unsigned int nodeType, unsigned int index, std::string name);

private:
    const std::string name_;
};

/// A hard drive: a "Disk" line of the disk snapshot.
class HardDriveNode : public StorageNode {
public:
    enum DrivePropertyId : unsigned int {
        driveSize = 37,  ///< unsigned 64-bit, thousands of bytes
    };

    HardDriveNode(unsigned int nodeId, unsigned int linkedId, std::vector<unsigned int> miIds,
                  unsigned int nodeType, unsigned int index, std::string name);
    ~HardDriveNode() override;
    Error getProperty(unsigned int id, PropertyValue& out) const override;
    Error setProperty(const unsigned int& id, const PropertyValue& value) override;
};

/// A partition: a "/dev" line of the disk snapshot.
class DiskPartition : public StorageNode {
public:
    enum PartitionPropertyId : unsigned int {
        partitionName = 108,    ///< text: the device path again
        partitionBlocks = 112,  ///< unsigned 64-bit, blocks of 1024 bytes
    };

    DiskPartition(unsigned int nodeId, unsigned int linkedId, std::vector<unsigned int> miIds,
                  unsigned int nodeType, unsigned int index, std::string name);
    ~DiskPartition() override;
    Error getProperty(unsigned int id, PropertyValue& out) const override;
    Error setProperty(const unsigned int& id, const PropertyValue& value) override;
};

}  // namespace IC
