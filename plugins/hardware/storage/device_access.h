#pragma once

#include <cstdint>
#include <functional>
#include <map>
#include <memory>
#include <optional>
#include <string>
#include <vector>

#include "plugins/hardware/network/neighbours.h"

namespace hardware {

/// A device file, and what the kernel says it must be: what stands there instead is not asked.
struct DeviceFile {
    enum class Sort { block, character };

    std::string path;    ///< "/dev/sda"
    std::string number;  ///< "8:0"
    std::string
        sequence;  ///< another one when another device takes the name (diskseq); "" where there is none
    Sort sort = Sort::block;
};

/// What a device answers to a SCSI command.
struct ScsiAnswer {
    std::string data;
    std::string sense;
};

/// The room of a file system, in bytes.
struct Room {
    std::optional<unsigned long long> size;
    std::optional<unsigned long long> free;
};

/// How devices are asked: each call may take as long as the device likes. Nothing is opened for writing. An
/// interface, so that tests can stand in for devices. Any thread.
class DeviceAccess {
public:
    using Contents = std::map<std::string, std::string>;
    /// Texts by their names; neither holds a line break, no name a '='.
    using Told = std::map<std::string, std::string>;

    virtual ~DeviceAccess() = default;

    /// Does work that asks a device. Who waits for a drive cannot be ended by anybody, so where that can be,
    /// the work is done by another process: this one could not end before it.
    /// @return what the work told; empty when it could not be done
    virtual Told apart(const std::function<Told()>& work) const { return work(); }

    /// A log page of an NVMe controller, for the controller as a whole.
    /// @return nothing when it has none or may not be asked
    virtual std::optional<std::string> nvmeLog(const DeviceFile& controller, unsigned int page,
                                               std::size_t size) const = 0;
    /// One command that changes nothing and reads up to `size` bytes, maybe none.
    /// @return nothing when the device cannot be opened or the command did not reach it
    virtual std::optional<ScsiAnswer> scsi(const DeviceFile& drive, const std::vector<std::uint8_t>& command,
                                           std::size_t size) const = 0;
    /// What the file system that is mounted there says (statvfs).
    virtual std::optional<Room> room(const std::string& where) const = 0;
    /// What libblkid finds on the device: TYPE, USAGE, LABEL, UUID. Nothing where the library is missing.
    virtual Contents contents(const DeviceFile& device) const = 0;
    /// What lldpd has heard on all links.
    virtual Neighbours neighbours() const = 0;
};

/// Those of this host.
std::shared_ptr<const DeviceAccess> ownDevices();

}  // namespace hardware
