#include "storage/storage_nodes.h"

namespace IC {

namespace {

/// A device that is listed counts as healthy: the listing says nothing more about it.
PropertyValue healthOf(const std::string&) {
    return {Number(1U), true};
}

constexpr Property kStorageProperties[] = {
    {StorageProperty::healthState, healthOf},
};
static_assert(idsAscend(kStorageProperties));

}  // namespace

constinit const NodeClass hardDriveClass{"~HardDriveNode", kStorageProperties};
constinit const NodeClass diskPartitionClass{"~DiskPartition", kStorageProperties};

}  // namespace IC
