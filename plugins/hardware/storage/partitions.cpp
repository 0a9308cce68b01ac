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
    {kNumber, "Number", Kind::number, "", "partition", "its number in the partition table"},
    {kStart, "Start", Kind::number, "bytes", "start", "where on the device it begins"},
    {kSize, "Size", Kind::number, "bytes", "size", "how much it holds"},
    {kLabel, "Label", Kind::text, "", "PARTNAME in uevent, else ID_PART_ENTRY_NAME of udev",
     "its name in the partition table"},
    {kUuid, "UUID", Kind::text, "", "PARTUUID in uevent, else ID_PART_ENTRY_UUID of udev",
     "the number that no other partition has", kTrusted},
    {kPartitionType, "PartitionType", Kind::text, "", "ID_PART_ENTRY_TYPE of udev",
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
    const TextMap udev = block::udevFacts(host, found.name);
    if (const auto holder = block::holderOf(host, found.name)) {
        found.parent = {block::classOf(host, *holder).value_or(Class::drive), *holder};
    }
    Facts& facts = found.facts;
    facts.number(kNumber, host.number(directory + "/partition"));
    facts.number(kStart, block::bytes(host.number(directory + "/start")));
    facts.number(kSize, block::sizeOf(host, found.name));
    const std::string uevent = directory + "/uevent";
    facts.text(kLabel, firstTold({host.field(uevent, "PARTNAME"), textOf(udev, "ID_PART_ENTRY_NAME")}));
    if (host.privileged()) {
        facts.text(kUuid, firstTold({host.field(uevent, "PARTUUID"), textOf(udev, "ID_PART_ENTRY_UUID")}));
    }
    facts.text(kPartitionType, textOf(udev, "ID_PART_ENTRY_TYPE"));
}

}  // namespace hardware
