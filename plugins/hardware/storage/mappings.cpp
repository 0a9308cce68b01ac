#include <algorithm>
#include <array>

#include "plugins/hardware/storage/block.h"
#include "plugins/hardware/storage/storage.h"

namespace hardware {

namespace {

constexpr auto kType = Class::mapping;

enum : Id {
    kMappingName = firstId(kType) + 1,
    kSort,
    kSize,
    kSuspended,
    kMembers,
};

constexpr Row kRows[] = {
    {kMappingName, "MappingName", Kind::text, "", "dm/name", "its name below /dev/mapper"},
    {kSort, "MappingKind", Kind::text, "", "how dm/uuid begins",
     "logical volume, encrypted, multipath and others"},
    {kSize, "Size", Kind::number, "bytes", "size", "how much it holds"},
    {kSuspended, "Suspended", Kind::flag, "", "dm/suspended", "whether it waits and serves nobody", kLive},
    {kMembers, "Members", Kind::texts, "", "slaves", "the devices it is built of"},
};

struct Sort {
    const char* prefix;
    const char* name;
};

constexpr std::array<Sort, 6> kSorts = {{{"LVM-", "logical volume"},
                                         {"CRYPT-", "encrypted"},
                                         {"mpath-", "multipath"},
                                         {"part", "partition"},
                                         {"DMRAID-", "firmware RAID"},
                                         {"VDO-", "deduplicated"}}};

std::optional<std::string> sortOf(const std::string& uuid) {
    const auto found = std::find_if(kSorts.begin(), kSorts.end(),
                                    [&uuid](const Sort& sort) { return uuid.starts_with(sort.prefix); });
    return found == kSorts.end() ? std::nullopt : std::optional<std::string>(found->name);
}

}  // namespace

Rows mappingRows() {
    return kRows;
}

std::vector<std::string> listMappings(const Host& host) {
    return block::ofClass(host, kType);
}

void describeMapping(const Host& host, Found& found) {
    const std::string directory = block::directory(found.name) + "/dm";
    found.facts.text(kMappingName, host.line(directory + "/name"));
    found.facts.text(kSort, sortOf(host.line(directory + "/uuid").value_or("")));
    found.facts.number(kSize, block::sizeOf(host, found.name));
    found.facts.flag(kSuspended, host.flag(directory + "/suspended"));
    found.facts.texts(kMembers, block::slaves(host, found.name));
}

}  // namespace hardware
