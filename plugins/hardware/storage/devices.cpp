#include "plugins/hardware/storage/devices.h"

#include <array>
#include <utility>

#include "plugins/hardware/host.h"
#include "plugins/hardware/storage/block.h"

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

namespace {

constexpr const char* kPower = "power";
constexpr const char* kTemperature = "temperature";
constexpr const char* kWarning = "warning";

struct Count {
    const char* name;
    std::optional<unsigned long long> Health::*value;
};

constexpr std::array<Count, 4> kCounts = {{{"worn", &Health::worn},
                                           {"spare", &Health::spare},
                                           {"hours", &Health::hours},
                                           {"media errors", &Health::mediaErrors}}};

}  // namespace

DeviceAccess::Told toldOf(const Health& health) {
    DeviceAccess::Told told;
    if (health.power) {
        told[kPower] = *health.power;
    }
    if (health.temperature) {
        told[kTemperature] = std::to_string(*health.temperature);
    }
    for (const Count& count : kCounts) {
        if (const auto value = health.*count.value) {
            told[count.name] = std::to_string(*value);
        }
    }
    for (std::size_t place = 0; place < health.warnings.size(); ++place) {
        told[kWarning + std::to_string(place)] = health.warnings[place];
    }
    return told;
}

Health healthFrom(const DeviceAccess::Told& told) {
    Health health;
    health.power = block::fact(told, kPower);
    if (const auto degrees = block::fact(told, kTemperature)) {
        health.temperature = asSigned(*degrees);
    }
    for (const Count& count : kCounts) {
        const auto value = block::fact(told, count.name);
        health.*count.value = value ? asNumber(*value) : std::nullopt;
    }
    for (const auto& [name, text] : told) {
        if (name.starts_with(kWarning)) {
            health.warnings.push_back(text);
        }
    }
    return health;
}

Devices::Devices(std::shared_ptr<const DeviceAccess> access, const Times& times)
    : access_(std::move(access)),
      health_({times.patience, times.health}),
      room_({times.patience, times.room}),
      contents_({times.patience, times.contents}),
      neighbours_({times.patience, times.neighbours}) {}

std::optional<Health> Devices::health(const HealthSource& source) {
    return health_.of(source.file.path + " " + source.file.sequence, [access = access_, source] {
        return healthFrom(access->apart([&] { return toldOf(askHealth(*access, source)); }));
    });
}

std::optional<Room> Devices::room(const std::string& where) {
    return room_.of(where, [access = access_, where] { return access->room(where).value_or(Room()); });
}

DeviceAccess::Contents Devices::contents(const DeviceFile& device) {
    const std::string name = device.path + " " + device.sequence;
    const auto now = contents_.of(name, [access = access_, device] { return access->contents(device); });
    return now ? *now : contents_.lastOf(name).value_or(DeviceAccess::Contents());
}

std::optional<Neighbours> Devices::neighbours() {
    return neighbours_.of("lldpd", [access = access_] { return access->neighbours(); });
}

}  // namespace hardware
