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

/// The device whose directory holds the partition's.
std::optional<std::string> holderOf(const Host& host, const std::string& name) {
    const std::string way = host.resolved(block::directory(name)).value_or("");
    const std::size_t end = way.rfind('/');
    const std::size_t start = end == std::string::npos || end == 0 ? end : way.rfind('/', end - 1);
    return start == std::string::npos ? std::nullopt : std::optional(way.substr(start + 1, end - start - 1));
}

}  // namespace

Rows partitionRows() {
    return kRows;
}

std::vector<std::string> listPartitions(const Host& host) {
    return block::ofClass(host, kType);
}

void describePartition(const Host& host, Found& found) {
    constexpr unsigned long long kSector = 512;
    const std::string directory = block::directory(found.name);
    const block::UdevFacts udev = block::udevFacts(host, found.name);
    if (const auto holder = holderOf(host, found.name)) {
        found.parent = {block::classOf(host, *holder).value_or(Class::drive), *holder};
    }
    Facts& facts = found.facts;
    facts.number(kNumber, host.number(directory + "/partition"));
    const auto start = host.number(directory + "/start");
    facts.number(kStart, start ? std::optional(*start * kSector) : std::nullopt);
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
