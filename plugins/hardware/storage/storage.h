#pragma once

#include "plugins/hardware/sources.h"

namespace hardware {

// Drives of every kind.
Rows driveRows();
std::vector<std::string> listDrives(const Host& host);
void describeDrive(const Host& host, Found& found);

// Arrays of md.
Rows arrayRows();
std::vector<std::string> listArrays(const Host& host);
void describeArray(const Host& host, Found& found);

// Devices of device-mapper: logical volumes, encrypted devices, multipath.
Rows mappingRows();
std::vector<std::string> listMappings(const Host& host);
void describeMapping(const Host& host, Found& found);

// Partitions of all of these.
Rows partitionRows();
std::vector<std::string> listPartitions(const Host& host);
void describePartition(const Host& host, Found& found);

// File systems and swap areas on any of them, by the name of the device.
Rows fileSystemRows();
std::vector<std::string> listFileSystems(const Host& host);
void describeFileSystem(const Host& host, Found& found);

}  // namespace hardware
