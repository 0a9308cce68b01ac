#include "plugins/hardware/storage/devices.h"

#include <utility>

namespace hardware {

Health askHealth(const DeviceAccess& access, const HealthSource& source) {
    switch (source.way) {
        case HealthWay::nvme:
            return askNvme(access, source.file);
        case HealthWay::ata:
            return askAta(access, source.file);
        case HealthWay::scsi:
            break;
    }
    return askScsi(access, source.file);
}

Devices::Devices(std::shared_ptr<const DeviceAccess> access, const Times& times)
    : access_(std::move(access)),
      health_({times.patience, times.health}),
      room_({times.patience, times.room}),
      contents_({times.patience, times.contents}),
      neighbours_({times.patience, times.neighbours}) {}

std::optional<Health> Devices::health(const HealthSource& source) {
    return health_.of(source.file.path + " " + source.file.sequence,
                      [access = access_, source] { return askHealth(*access, source); });
}

std::optional<Room> Devices::room(const std::string& where) {
    return room_.of(where, [access = access_, where] { return access->room(where).value_or(Room()); });
}

DeviceAccess::Contents Devices::contents(const DeviceFile& device) {
    return contents_
        .of(device.path + " " + device.sequence,
            [access = access_, device] { return access->contents(device); })
        .value_or(DeviceAccess::Contents());
}

std::optional<Neighbours> Devices::neighbours() {
    return neighbours_.of("lldpd", [access = access_] { return access->neighbours(); });
}

}  // namespace hardware
