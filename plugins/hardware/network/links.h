#pragma once

#include "plugins/hardware/sources.h"

namespace hardware {

// Network links of every kind (/sys/class/net, and the driver's own word on this host).
Rows linkRows();
std::vector<std::string> listLinks(const Host& host);
void describeLink(const Host& host, Found& found);

}  // namespace hardware
