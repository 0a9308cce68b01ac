#pragma once

#include "plugins/hardware/sources.h"

namespace hardware {

// Processors, one node a socket (/sys/devices/system/cpu, /proc/cpuinfo).
Rows processorRows();
std::vector<std::string> listProcessors(const Host& host);
void describeProcessor(const Host& host, Found& found);

}  // namespace hardware
