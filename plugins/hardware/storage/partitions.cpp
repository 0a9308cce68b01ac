#include "plugins/hardware/storage/block.h"
#include "plugins/hardware/storage/storage.h"

namespace hardware {

namespace {

constexpr auto kType = Class::partition;

enum : Id {
    kNumber = firstId(kType) + 1,
    kStart,
    kSize,
    kLabel,
    kUuid,
    kPartitionType,
};

constexpr Row kRows[] = {
    {kType, kNumber, "Number", Kind::number, "", "partition", "its number in the partition table"},
    {kType, kStart, "Start", Kind::number, "bytes", "start", "where on the device it begins"},
    {kType, kSize, "Size", Kind::number, "bytes", "size", "how much it holds"},
    {kType, kLabel, "Label", Kind::text, "", "PARTNAME in uevent, else ID_PART_ENTRY_NAME of udev",
     "its name in the partition table"},
    {kType, kUuid, "UUID", Kind::text, "", "PARTUUID in uevent, else ID_PART_ENTRY_UUID of udev",
     "the number that no other partition has", Audience::trusted},
    {kType, kPartitionType, "PartitionType", Kind::text, "", "ID_PART_ENTRY_TYPE of udev",
     "what it is for, as the partition table says it"},
};

}  // namespace

Rows partitionRows() {
    return kRows;
}

std::vector<std::string> listPartitions(const Host& host) {
    return block::ofClass(host, kType);
}

void describePartition(const Host& host, Found& found) {
    const std::string directory = block::directory(found.name);
    const block::UdevFacts udev = block::udevFacts(host, found.name);
    if (const auto holder = block::holderOf(host, found.name)) {
        found.parent = {block::classOf(host, *holder).value_or(Class::drive), *holder};
    }
    Facts& facts = found.facts;
    facts.number(kNumber, host.number(directory + "/partition"));
    facts.number(kStart, block::bytes(host.number(directory + "/start")));
    facts.number(kSize, block::sizeOf(host, found.name));
    const auto label = host.field(directory + "/uevent", "PARTNAME");
    facts.text(kLabel, label ? label : block::fact(udev, "ID_PART_ENTRY_NAME"));
    if (host.privileged()) {
        const auto uuid = host.field(directory + "/uevent", "PARTUUID");
        facts.text(kUuid, uuid ? uuid : block::fact(udev, "ID_PART_ENTRY_UUID"));
    }
    facts.text(kPartitionType, block::fact(udev, "ID_PART_ENTRY_TYPE"));
}

}  // namespace hardware
