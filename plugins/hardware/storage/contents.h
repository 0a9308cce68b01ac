#pragma once

#include <optional>
#include <string>

#include "plugins/hardware/host.h"

namespace hardware {

/// What lies on a device, as udev has found out; where no udev runs, as the device itself shows it.
struct DeviceContents {
    std::optional<std::string> type;
    std::optional<std::string> label;
    std::optional<std::string> uuid;
    bool isFileSystem = false;  ///< or a swap area, rather than a member of something larger
};

/// @param mounted whether its drive is awake for sure; others are read only where that wakes none
DeviceContents contentsOf(const Host& host, const std::string& name, bool mounted);

}  // namespace hardware
