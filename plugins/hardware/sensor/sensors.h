#pragma once

#include "plugins/hardware/sources.h"

namespace hardware {

// Sensors of temperature, fans, voltage and the like (/sys/class/hwmon; /sys/class/thermal where a zone is in
// no chip).
Rows sensorRows();
std::vector<std::string> listSensors(const Host& host);
void describeSensor(const Host& host, Found& found);

}  // namespace hardware
