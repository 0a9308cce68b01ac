#pragma once

#include <optional>
#include <string>
#include <vector>

#include "plugins/hardware/storage/device_access.h"

namespace hardware {

/// How a drive feels, as far as it says so.
struct Health {
    std::optional<std::string> power;      ///< "active", "idle", "standby"
    std::optional<long long> temperature;  ///< degrees Celsius
    std::optional<unsigned long long>
        worn;  ///< percent of the life that the maker promises; can be above 100
    std::optional<unsigned long long> spare;  ///< percent of the spare blocks that are left
    std::optional<unsigned long long> hours;
    std::optional<unsigned long long> mediaErrors;
    std::vector<std::string> warnings;
};

/// Which commands a drive understands.
enum class HealthWay { nvme, ata, scsi };

/// Where health is asked for: a drive's own device file, for NVMe its controller's.
struct HealthSource {
    HealthWay way;
    DeviceFile file;
};

/// As texts, and from them.
DeviceAccess::Told toldOf(const Health& health);
Health healthFrom(const DeviceAccess::Told& told);

/// Asks one drive. A drive that sleeps is asked nothing but whether it does.
Health askHealth(const DeviceAccess& access, const HealthSource& source);

Health askNvme(const DeviceAccess& access, const DeviceFile& controller);
Health askAta(const DeviceAccess& access, const DeviceFile& drive);
Health askScsi(const DeviceAccess& access, const DeviceFile& drive);

/// What log page 2 of an NVMe controller says (NVM Express, "SMART / Health Information").
Health nvmeHealth(const std::string& page);

}  // namespace hardware
