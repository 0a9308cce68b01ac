#pragma once

#include "plugins/hardware/sources.h"

namespace hardware {

// Sensors of temperature, fans, voltage and the like (/sys/class/hwmon; /sys/class/thermal where a zone is in
// no chip).
Rows sensorRows();
std::vector<std::string> listSensors(const Host& host);
void describeSensor(const Host& host, Found& found);
/// The chip of a sensor: one that hangs would let each of its sensors wait.
std::string chipOf(const std::string& name);

}  // namespace hardware
