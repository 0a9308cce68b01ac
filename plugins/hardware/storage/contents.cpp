#include "plugins/hardware/storage/contents.h"

#include "plugins/hardware/storage/block.h"
#include "plugins/hardware/storage/devices.h"

namespace hardware {

namespace {

bool isFileSystem(const std::optional<std::string>& type, const std::optional<std::string>& usage) {
    return usage == "filesystem" || type == "swap";
}

/// Whether a device can be read without a drive being woken for it.
bool mayBeRead(const Host& host, const std::string& name, bool mounted) {
    const std::string path = block::directory(name);
    const std::string queue = host.exists(path + "/queue") ? path + "/queue" : path + "/../queue";
    return block::sizeOf(host, name) && !block::isSuspended(host, name) &&
           (mounted || host.flag(queue + "/rotational") == false);
}

}  // namespace

DeviceContents contentsOf(const Host& host, const std::string& name, bool mounted) {
    if (block::hasUdev(host)) {
        const TextMap udev = block::udevFacts(host, name);
        const auto type = textOf(udev, "ID_FS_TYPE");
        const auto label = firstTold({textOf(udev, "ID_FS_LABEL_ENC"), textOf(udev, "ID_FS_LABEL")});
        return {type, label, textOf(udev, "ID_FS_UUID"), isFileSystem(type, textOf(udev, "ID_FS_USAGE"))};
    }
    if (host.devices() == nullptr || !mayBeRead(host, name, mounted)) {
        return {};
    }
    const DeviceAccess::Contents read = host.devices()->contents(block::fileOf(host, name));
    const auto type = textOf(read, "TYPE");
    return {type, textOf(read, "LABEL"), textOf(read, "UUID"), isFileSystem(type, textOf(read, "USAGE"))};
}

}  // namespace hardware
