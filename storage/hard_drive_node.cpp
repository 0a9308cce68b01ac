#include "storage/hard_drive_node.h"

#include <utility>

#include "mi/log.h"

namespace IC {

HardDriveNode::HardDriveNode(unsigned int nodeId, unsigned int linkedId, std::vector<unsigned int> miIds,
                             unsigned int nodeType, unsigned int index, std::string name)
    : MutableNode(nodeId, linkedId, std::move(miIds), nodeType, index), name_(std::move(name)) {
    const LogScope scope("HardDriveNode::HardDriveNode");
}

HardDriveNode::~HardDriveNode() {
    const LogScope scope("HardDriveNode::~HardDriveNode");
}

Error HardDriveNode::getProperty(unsigned int id, PropertyValue& out) const {
    const LogScope scope("HardDriveNode::getProperty");
    if (id != healthState) {
        return MutableNode::getProperty(id, out);
    }
    out = PropertyValue(Number(1U), true);
    return {};
}

Error HardDriveNode::setProperty(const unsigned int& id, const PropertyValue& value) {
    const LogScope scope("HardDriveNode::setProperty");
    return MutableNode::setProperty(id, value);
}

}  // namespace IC
