#include <sys/statvfs.h>

#include <algorithm>

#include "plugins/hardware/storage/block.h"
#include "plugins/hardware/storage/mounts.h"
#include "plugins/hardware/storage/storage.h"

namespace hardware {

namespace {

constexpr auto kType = Class::fileSystem;

enum : Id {
    kSort = firstId(kType) + 1,
    kLabel,
    kUuid,
    kMountPoints,
    kSize,
    kFree,
};

constexpr Row kRows[] = {
    {kType, kSort, "FileSystemType", Kind::text, "", "/proc/1/mountinfo, else ID_FS_TYPE of udev",
     "ext4, xfs, swap and others"},
    {kType, kLabel, "Label", Kind::text, "", "ID_FS_LABEL_ENC of udev", "its label"},
    {kType, kUuid, "UUID", Kind::text, "", "ID_FS_UUID of udev", "the number that no other file system has",
     Audience::trusted},
    {kType, kMountPoints, "MountPoints", Kind::texts, "", "/proc/1/mountinfo", "where it is mounted",
     Audience::everybody, true},
    {kType, kSize, "Size", Kind::number, "bytes", "statvfs", "how much it holds; told while it is mounted",
     Audience::everybody, true},
    {kType, kFree, "Free", Kind::number, "bytes", "statvfs", "what users can still put there",
     Audience::everybody, true},
};

/// Where the device is mounted. Some file systems have numbers of their own and name the device only.
std::vector<Mount> mountsOf(const Host& host, const std::string& name, const std::vector<Mount>& all) {
    const std::string number = block::number(host, name).value_or("");
    const std::string mapped = host.line(block::directory(name) + "/dm/name").value_or("");
    std::vector<Mount> found = all;
    std::erase_if(found, [&](const Mount& mount) {
        const bool named =
            mount.source == "/dev/" + name || (!mapped.empty() && mount.source == "/dev/mapper/" + mapped);
        return mount.number != number && !(mount.number.starts_with("0:") && named);
    });
    return found;
}

bool isFileSystem(const block::UdevFacts& udev) {
    const auto usage = block::fact(udev, "ID_FS_USAGE");
    return usage == "filesystem" || block::fact(udev, "ID_FS_TYPE") == "swap";
}

void measure(const std::string& where, Facts& facts) {
    struct statvfs room {};
    if (statvfs(where.c_str(), &room) == 0 && room.f_blocks != 0) {
        facts.number(kSize, static_cast<unsigned long long>(room.f_blocks) * room.f_frsize);
        facts.number(kFree, static_cast<unsigned long long>(room.f_bavail) * room.f_frsize);
    }
}

}  // namespace

Rows fileSystemRows() {
    return kRows;
}

std::vector<std::string> listFileSystems(const Host& host) {
    const std::vector<Mount> all = mounts(host);
    std::vector<std::string> names = block::all(host);
    std::erase_if(names, [&](const std::string& name) {
        return !block::classOf(host, name) ||
               (mountsOf(host, name, all).empty() && !isFileSystem(block::udevFacts(host, name)));
    });
    return names;
}

void describeFileSystem(const Host& host, Found& found) {
    const block::UdevFacts udev = block::udevFacts(host, found.name);
    const std::vector<Mount> mounted = mountsOf(host, found.name, mounts(host));
    found.parent = {block::classOf(host, found.name).value_or(Class::drive), found.name};
    Facts& facts = found.facts;
    facts.text(kSort,
               mounted.empty() ? block::fact(udev, "ID_FS_TYPE") : std::optional(mounted.front().type));
    facts.text(kLabel, block::fact(udev, "ID_FS_LABEL_ENC"));
    if (host.privileged()) {
        facts.text(kUuid, block::fact(udev, "ID_FS_UUID"));
    }
    std::vector<std::string> places;
    std::transform(mounted.begin(), mounted.end(), std::back_inserter(places),
                   [](const Mount& mount) { return printable(mount.where); });
    facts.texts(kMountPoints, places);
    if (host.live() && !mounted.empty()) {
        measure(mounted.front().where, facts);
    }
}

}  // namespace hardware
