#include <algorithm>
#include <iterator>
#include <set>

#include "plugins/hardware/storage/block.h"
#include "plugins/hardware/storage/contents.h"
#include "plugins/hardware/storage/devices.h"
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
    {kType, kSort, "FileSystemType", Kind::text, "", "/proc/1/mountinfo, else ID_FS_TYPE of udev or libblkid",
     "ext4, xfs, swap and others"},
    {kType, kLabel, "Label", Kind::text, "", "ID_FS_LABEL_ENC of udev, else libblkid", "its label"},
    {kType, kUuid, "UUID", Kind::text, "", "ID_FS_UUID of udev, else libblkid",
     "the number that no other file system has", Audience::trusted},
    {kType, kMountPoints, "MountPoints", Kind::texts, "", "/proc/1/mountinfo", "where it is mounted",
     Audience::everybody, true},
    {kType, kSize, "Size", Kind::number, "bytes", "statvfs", "how much it holds; told while it is mounted",
     Audience::everybody, true},
    {kType, kFree, "Free", Kind::number, "bytes", "statvfs", "what users can still put there",
     Audience::everybody, true},
};

/// File systems on several devices have numbers of their own and name one of the devices. What others write
/// there is their own idea: a user's FUSE file system can name any device.
bool isOnSeveralDevices(const Mount& mount) {
    return mount.type == "btrfs" || mount.type == "bcachefs";
}

/// What a mount can call a device by.
std::set<std::string> handles(const Host& host, const std::string& name) {
    std::set<std::string> names{"/dev/" + name};
    if (const auto number = block::number(host, name)) {
        names.insert(*number);
    }
    if (const auto mapped = host.line(block::directory(name) + "/dm/name")) {
        names.insert("/dev/mapper/" + *mapped);
    }
    return names;
}

std::vector<Mount> mountsOf(const Host& host, const std::string& name, const std::vector<Mount>& all) {
    const std::set<std::string> own = handles(host, name);
    std::vector<Mount> found;
    std::copy_if(all.begin(), all.end(), std::back_inserter(found), [&own](const Mount& mount) {
        return own.contains(mount.number) || (isOnSeveralDevices(mount) && own.contains(mount.source));
    });
    return found;
}

std::vector<std::string> places(const std::vector<Mount>& mounted) {
    std::vector<std::string> texts(mounted.size());
    std::ranges::transform(mounted, texts.begin(), [](const Mount& mount) { return printable(mount.where); });
    return texts;
}

/// By a mount whose path leads there: what lies over others answers for itself, and a server that has gone
/// does not answer at all.
std::optional<std::string> wayTo(const Host& host, const std::string& name) {
    constexpr std::size_t kTries = 8;
    const Within within = mountsWithinReach(host);
    const std::vector<Mount> own = mountsOf(host, name, within.mounts);
    for (std::size_t at = 0; at < std::min(own.size(), kTries); ++at) {
        if (leadsThere(own[at], within.mounts)) {
            return within.root + own[at].where;
        }
    }
    return std::nullopt;
}

void addRoom(const Host& host, const std::string& name, Facts& facts) {
    const auto way = host.devices() == nullptr ? std::nullopt : wayTo(host, name);
    if (!way) {
        return;
    }
    if (const std::optional<Room> room = host.devices()->room(*way)) {
        facts.number(kSize, room->size);
        facts.number(kFree, room->free);
    } else {
        facts.unanswered(kSize);
        facts.unanswered(kFree);
    }
}

}  // namespace

Rows fileSystemRows() {
    return kRows;
}

std::vector<std::string> listFileSystems(const Host& host) {
    std::set<std::string> used;
    for (const Mount& mount : mounts(host)) {
        used.insert(isOnSeveralDevices(mount) ? mount.source : mount.number);
    }
    std::vector<std::string> names = block::all(host);
    std::erase_if(names, [&](const std::string& name) {
        const std::set<std::string> own = handles(host, name);
        const bool mounted = std::any_of(own.begin(), own.end(),
                                         [&used](const std::string& one) { return used.contains(one); });
        return !block::classOf(host, name) || (!mounted && !contentsOf(host, name, false).isFileSystem);
    });
    return names;
}

void describeFileSystem(const Host& host, Found& found) {
    const auto holder = block::classOf(host, found.name);
    if (!holder) {
        return;
    }
    found.parent = {*holder, found.name};
    const std::vector<Mount> own = mountsOf(host, found.name, mounts(host));
    const DeviceContents contents = contentsOf(host, found.name, !own.empty());
    const bool driverTells = !own.empty() && (!own.front().type.starts_with("fuse") || !contents.type);
    Facts& facts = found.facts;
    facts.text(kSort, driverTells ? std::optional(own.front().type) : contents.type);
    facts.text(kLabel, contents.label);
    if (host.privileged()) {
        facts.text(kUuid, contents.uuid);
    }
    facts.texts(kMountPoints, places(own));
    if (!own.empty()) {
        addRoom(host, found.name, facts);
    }
}

}  // namespace hardware
