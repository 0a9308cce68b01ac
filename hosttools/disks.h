#pragma once

#include <cstdint>
#include <optional>
#include <string>
#include <vector>

#include "hosttools/partition_table.h"

namespace hosttools {

/// A partition as the kernel knows it, with what its table says of it.
struct Partition {
    std::string name;           ///< as in /dev, "sda1"
    std::string deviceNumber;   ///< "8:1"
    std::uint64_t number = 0;   ///< counted from 1
    std::uint64_t start = 0;    ///< first sector, in 512 bytes whatever the disk's own sectors are
    std::uint64_t sectors = 0;  ///< length in the same unit
    TableEntry entry;           ///< boot flag and type
};

/// A whole disk.
struct Disk {
    std::string name;                 ///< as in /dev, "sda" ("cciss/c0d0" for a controller with a directory)
    std::string deviceNumber;         ///< "8:0"
    std::uint64_t sectors = 0;        ///< length in 512 bytes
    std::uint64_t logicalSize = 512;  ///< the disk's own sector size in bytes
    std::uint64_t physicalSize = 512;
    std::uint64_t minimumIo = 512;
    std::uint64_t optimalIo = 512;
    PartitionScheme scheme = PartitionScheme::none;
    std::uint32_t identifier = 0;       ///< of a DOS partition table
    std::vector<Partition> partitions;  ///< by number
};

/// The host's disks in an order that only depends on which disks there are: a monitor compares two listings.
/// Sizes and places come from sysfs. Flag and type come from the udev database, which holds what libblkid
/// found there when the disk appeared or was repartitioned, so that a listing does not touch the disks; only
/// a disk that udev does not know is read. Empty removable drives, CD drives, floppies, loop and memory
/// devices are left out.
/// @param root in front of /sys, /run and /dev; empty on a live host
std::vector<Disk> listDisks(const std::string& root);

enum class Opening { whereNeeded, none };
/// The same. @return nothing when a disk would have to be opened and none is to be: a disk can keep its
/// reader waiting
std::optional<std::vector<Disk>> listDisks(const std::string& root, Opening opening);

}  // namespace hosttools
