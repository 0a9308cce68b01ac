#pragma once

#include <optional>
#include <string>
#include <utility>
#include <vector>

#include "plugins/hardware/found.h"
#include "plugins/hardware/host.h"
#include "plugins/hardware/storage/device_access.h"

namespace hardware::block {

// What all kinds of block devices have in common, by their names in the kernel: "sda", "md0", "nvme0n1p2".

/// All of them, partitions included (/sys/class/block).
std::vector<std::string> all(const Host& host);
/// The directory of one of them.
std::string directory(const std::string& name);

/// A partition belongs to another device, a drive is one itself, an array is md's, a mapping device-mapper's.
/// Loop devices, disks in memory and their partitions are none of these, nor are the single ways to a drive
/// that the kernel shows as one.
std::optional<Class> classOf(const Host& host, const std::string& name);
/// The names of the devices of one class.
std::vector<std::string> ofClass(const Host& host, Class type);

/// The device that holds a partition.
std::optional<std::string> holderOf(const Host& host, const std::string& partition);
/// The device file, by its usual name: the kernel writes '!' for a '/' in it.
DeviceFile fileOf(const Host& host, const std::string& name);
/// Whether the kernel lets the device sleep, or the one that holds the partition: opening it would wake it.
bool isSuspended(const Host& host, const std::string& name);

/// What the kernel counts in sectors of 512 bytes, in bytes; nothing for what no 64 bits hold.
std::optional<unsigned long long> bytes(std::optional<unsigned long long> sectors);
/// In bytes; nothing for a drive without a medium.
std::optional<unsigned long long> sizeOf(const Host& host, const std::string& name);
/// "8:1"; nothing when the device has gone.
std::optional<std::string> number(const Host& host, const std::string& name);
/// What it is built of.
std::vector<std::string> slaves(const Host& host, const std::string& name);

/// What udev has found out about it (/run/udev/data): ID_FS_TYPE and the like, without the device being
/// opened here. Empty where no udev runs.
bool hasUdev(const Host& host);
TextMap udevFacts(const Host& host, const std::string& name);

/// Reads, writes and errors so far, as rows of the class.
struct Counters {
    Id reads;
    Id readBytes;
    Id writes;
    Id writtenBytes;
};
void count(const Host& host, const std::string& name, const Counters& ids, Facts& facts);

}  // namespace hardware::block
