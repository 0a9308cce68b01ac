#pragma once

#include "plugins/hardware/sources.h"

namespace hardware {

// The memory as the kernel counts it (/proc/meminfo, /sys/devices/system/edac).
Rows memoryRows();
std::vector<std::string> listMemory(const Host& host);
void describeMemory(const Host& host, Found& found);

// Its modules, as the firmware lists them (SMBIOS tables, which only root may read).
Rows memoryModuleRows();
std::vector<std::string> listMemoryModules(const Host& host);
void describeMemoryModule(const Host& host, Found& found);

}  // namespace hardware
