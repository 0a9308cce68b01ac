#pragma once

#include <optional>
#include <string>

#include "plugins/hardware/host.h"

namespace hardware {

/// Who made a drive and which it is, from the files of its device and from udev: no device is asked.
struct DriveIdentity {
    std::optional<std::string> maker;
    std::optional<std::string> model;
    std::optional<std::string> serial;
    std::optional<std::string> firmware;
    std::optional<std::string> wwn;
};

/// How it is attached: "nvme", "sata", "sas", "usb", "virtio" and others.
std::optional<std::string> transportOf(const Host& host, const std::string& name);

DriveIdentity identify(const Host& host, const std::string& name);

}  // namespace hardware
