#pragma once

#include <map>
#include <optional>
#include <string>
#include <utility>
#include <vector>

#include "plugins/hardware/found.h"
#include "plugins/hardware/host.h"

namespace hardware::block {

// What all kinds of block devices have in common, by their names in the kernel: "sda", "md0", "nvme0n1p2".

/// All of them, partitions included (/sys/class/block).
std::vector<std::string> all(const Host& host);
/// The directory of one of them.
std::string directory(const std::string& name);

/// A partition belongs to another device, a drive is one itself, an array is md's, a mapping device-mapper's.
/// Loop devices and disks in memory are none of these.
std::optional<Class> classOf(const Host& host, const std::string& name);
/// The names of the devices of one class.
std::vector<std::string> ofClass(const Host& host, Class type);

/// In bytes; nothing for a drive without a medium.
std::optional<unsigned long long> sizeOf(const Host& host, const std::string& name);
/// "8:1"; nothing when the device has gone.
std::optional<std::string> number(const Host& host, const std::string& name);
/// What it is built of, or what is built of it.
std::vector<std::string> slaves(const Host& host, const std::string& name);

/// What udev has found out about it (/run/udev/data): ID_FS_TYPE and the like, without the device being
/// opened here. Empty where no udev runs.
using UdevFacts = std::map<std::string, std::string>;
UdevFacts udevFacts(const Host& host, const std::string& name);
std::optional<std::string> fact(const UdevFacts& facts, const std::string& key);

/// Reads, writes and errors so far, as rows of the class.
struct Counters {
    Id reads;
    Id readBytes;
    Id writes;
    Id writtenBytes;
};
void count(const Host& host, const std::string& name, const Counters& ids, Facts& facts);

}  // namespace hardware::block
