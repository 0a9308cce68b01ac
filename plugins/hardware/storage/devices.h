#pragma once

#include <memory>
#include <string>

#include "plugins/hardware/storage/answers.h"
#include "plugins/hardware/storage/device_access.h"
#include "plugins/hardware/storage/health.h"

namespace hardware {

/// What only the devices know, asked with patience and kept for a while. Any thread.
class Devices {
public:
    /// How long a device is waited for: shorter than what a source may take, so that a device that hangs
    /// costs what only it knows and not what the kernel knows of it. A minute is soon enough for
    /// temperatures; the room of a file system changes faster.
    struct Times {
        std::chrono::milliseconds patience{700};
        std::chrono::milliseconds health{60'000};
        std::chrono::milliseconds room{400};
        std::chrono::milliseconds contents{60'000};
        std::chrono::milliseconds neighbours{10'000};
    };
    explicit Devices(std::shared_ptr<const DeviceAccess> access) : Devices(std::move(access), Times()) {}
    Devices(std::shared_ptr<const DeviceAccess> access, const Times& times);

    /// Nothing when the drive does not answer in time; what it cannot tell is not filled in.
    std::optional<Health> health(const HealthSource& source);
    /// In the same way.
    std::optional<Room> room(const std::string& where);
    /// What it was last where the device does not answer: a file system is not gone because of that. Empty
    /// when nothing is known.
    DeviceAccess::Contents contents(const DeviceFile& device);
    /// Nothing when lldpd does not answer in time.
    std::optional<Neighbours> neighbours();

private:
    const std::shared_ptr<const DeviceAccess> access_;
    Answers<Health> health_;
    Answers<Room> room_;
    Answers<DeviceAccess::Contents> contents_;
    Answers<Neighbours> neighbours_;
};

}  // namespace hardware
