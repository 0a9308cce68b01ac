// Drives and partitions.
#include "agent/core/oshw/tables.h"

namespace cvagent::oshw {

namespace {

constexpr Label kHealth[] = {{"normal", 1}};

constexpr Property kStorageRows[] = {
    {NodeType::hardDrive,
     37,
     "DriveSize",
     Kind::number,
     Unit::thousandBytes,
     {},
     "size in thousands of bytes"},
    {NodeType::hardDrive, 89, "DevicePath", Kind::text, Unit::none, {}, "the drive's device file"},
    {NodeType::hardDrive, 123, "HealthState", Kind::number, Unit::none, kHealth, "always 1"},
    {NodeType::partition, 89, "DevicePath", Kind::text, Unit::none, {}, "the partition's device file"},
    {NodeType::partition, 108, "PartitionName", Kind::text, Unit::none, {}, "the device file once more"},
    {NodeType::partition,
     112,
     "PartitionBlocks",
     Kind::number,
     Unit::kibibytes,
     {},
     "size in blocks of 1024 bytes"},
    {NodeType::partition, 123, "HealthState", Kind::number, Unit::none, kHealth, "always 1"},
};

}  // namespace

std::span<const Property> storageProperties() {
    return kStorageRows;
}

}  // namespace cvagent::oshw
