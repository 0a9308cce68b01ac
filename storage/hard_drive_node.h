#pragma once

#include <string>
#include <vector>

#include "framework/ic/mutable_node.h"

namespace IC {

/// A hard drive: a "Disk" line of the disk snapshot.
class HardDriveNode : public MutableNode {
public:
    enum PropertyId : unsigned int {
        driveSize = 37,     ///< unsigned 64-bit, thousands of bytes
        devicePath = 89,    ///< text
        healthState = 123,  ///< live: always 1
    };

    /// Arguments as for MutableNode.
    /// @param index counts the drives of one build, from 1
    /// @param name  the device path, e.g. "/dev/sda"
    HardDriveNode(unsigned int nodeId, unsigned int linkedId, std::vector<unsigned int> miIds,
                  unsigned int nodeType, unsigned int index, std::string name);
    ~HardDriveNode() override;

    /// Status 0 with 1 for healthState; any other id as it was stored when the node was built. Nothing is
    /// asked of the host.
    Error getProperty(unsigned int id, PropertyValue& out) const override;
    /// Stores the value; nothing on the host is changed.
    Error setProperty(const unsigned int& id, const PropertyValue& value) override;

    const std::string& name() const { return name_; }

private:
    const std::string name_;
};

}  // namespace IC
