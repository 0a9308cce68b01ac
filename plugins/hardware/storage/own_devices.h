#pragma once

#include "plugins/hardware/storage/device_access.h"

namespace hardware {

/// A device file, opened for reading; not open when another device stands there.
class OpenDevice {
public:
    explicit OpenDevice(const DeviceFile& device);
    OpenDevice(const OpenDevice&) = delete;
    OpenDevice& operator=(const OpenDevice&) = delete;
    ~OpenDevice();

    bool isOpen() const { return descriptor_ >= 0; }
    int descriptor() const { return descriptor_; }

private:
    int descriptor_;
};

/// This host's devices, by ioctls, statvfs, libblkid and lldpd.
class OwnDevices : public DeviceAccess {
public:
    Told apart(const std::function<Told()>& work) const override;
    std::optional<std::string> nvmeLog(const DeviceFile& controller, unsigned int page,
                                       std::size_t size) const override;
    std::optional<ScsiAnswer> scsi(const DeviceFile& drive, const std::vector<std::uint8_t>& command,
                                   std::size_t size) const override;
    std::optional<Room> room(const std::string& where) const override;
    Contents contents(const DeviceFile& device) const override;
    Neighbours neighbours() const override;
};

/// What libblkid finds in a file or on a device: TYPE, USAGE, LABEL, UUID. Empty where the library is missing
/// and where two file systems lie on one another.
DeviceAccess::Contents probe(int descriptor);

}  // namespace hardware
