#include "storage/storage_nodes.h"

#include <utility>

#include "mi/log.h"
#include "mi/property_table.h"

namespace IC {

namespace {

/// A device that is listed counts as healthy: the listing says nothing more about it.
Error readHealthState(const StorageNode&, PropertyValue& out) {
    out = PropertyValue(Number(1U), true);
    return result(true);
}

constexpr Property<StorageNode> kLive[] = {
    {StorageNode::healthState, "HealthState", readHealthState},
};
static_assert(idsAscend(kLive));

}  // namespace

StorageNode::StorageNode(unsigned int nodeId, unsigned int linkedId, std::vector<unsigned int> miIds,
                         unsigned int nodeType, unsigned int index, std::string name)
    : MutableNode(nodeId, linkedId, std::move(miIds), nodeType, index), name_(std::move(name)) {}

Error StorageNode::getProperty(unsigned int id, PropertyValue& out) const {
    const auto* row = findProperty(kLive, id);
    return row != nullptr ? row->read(*this, out) : MutableNode::getProperty(id, out);
}

HardDriveNode::HardDriveNode(unsigned int nodeId, unsigned int linkedId, std::vector<unsigned int> miIds,
                             unsigned int nodeType, unsigned int index, std::string name)
    : StorageNode(nodeId, linkedId, std::move(miIds), nodeType, index, std::move(name)) {
    const LogScope scope("HardDriveNode::HardDriveNode");
}

HardDriveNode::~HardDriveNode() {
    const LogScope scope("HardDriveNode::~HardDriveNode");
}

Error HardDriveNode::getProperty(unsigned int id, PropertyValue& out) const {
    const LogScope scope("HardDriveNode::getProperty");
    return StorageNode::getProperty(id, out);
}

Error HardDriveNode::setProperty(const unsigned int& id, const PropertyValue& value) {
    const LogScope scope("HardDriveNode::setProperty");
    return MutableNode::setProperty(id, value);
}

DiskPartition::DiskPartition(unsigned int nodeId, unsigned int linkedId, std::vector<unsigned int> miIds,
                             unsigned int nodeType, unsigned int index, std::string name)
    : StorageNode(nodeId, linkedId, std::move(miIds), nodeType, index, std::move(name)) {
    const LogScope scope("DiskPartition::DiskPartition");
}

DiskPartition::~DiskPartition() {
    const LogScope scope("DiskPartition::~DiskPartition");
}

Error DiskPartition::getProperty(unsigned int id, PropertyValue& out) const {
    const LogScope scope("DiskPartition::getProperty");
    return StorageNode::getProperty(id, out);
}

Error DiskPartition::setProperty(const unsigned int& id, const PropertyValue& value) {
    const LogScope scope("DiskPartition::setProperty");
    return MutableNode::setProperty(id, value);
}

}  // namespace IC
