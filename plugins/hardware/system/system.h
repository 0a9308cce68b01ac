#pragma once

#include "plugins/hardware/sources.h"

namespace hardware {

// The computer as its firmware tells it (/sys/class/dmi/id), and the system that runs on it.
Rows systemRows();
std::vector<std::string> listSystem(const Host& host);
void describeSystem(const Host& host, Found& found);

}  // namespace hardware
