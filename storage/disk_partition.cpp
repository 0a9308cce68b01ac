#include "storage/disk_partition.h"

#include <utility>

#include "mi/log.h"

namespace IC {

DiskPartition::DiskPartition(unsigned int nodeId, unsigned int linkedId, std::vector<unsigned int> miIds,
                             unsigned int nodeType, unsigned int index, std::string name)
    : MutableNode(nodeId, linkedId, std::move(miIds), nodeType, index), name_(std::move(name)) {
    const LogScope scope("DiskPartition::DiskPartition");
}

DiskPartition::~DiskPartition() {
    const LogScope scope("DiskPartition::~DiskPartition");
}

Error DiskPartition::getProperty(unsigned int id, PropertyValue& out) const {
    const LogScope scope("DiskPartition::getProperty");
    if (id != healthState) {
        return MutableNode::getProperty(id, out);
    }
    out = PropertyValue(Number(1U), true);
    return {};
}

Error DiskPartition::setProperty(const unsigned int& id, const PropertyValue& value) {
    const LogScope scope("DiskPartition::setProperty");
    return MutableNode::setProperty(id, value);
}

}  // namespace IC
