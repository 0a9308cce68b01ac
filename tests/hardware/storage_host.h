#pragma once

#include <chrono>
#include <map>
#include <memory>
#include <string>

#include "plugins/hardware/storage/devices.h"
#include "tests/hardware/fake_devices.h"
#include "tests/hardware/golden.h"
#include "tests/hardware/recorded_host.h"

namespace hardware_test {

/// A small host below a directory of its own, with devices that a test answers for.
class StorageHost : public RecordedHost {
public:
    /// A block device without a partition table: a directory below /sys/devices and its link.
    void block(const std::string& name, const std::string& bus, const std::string& number,
               const std::string& sectors = "2048") const {
        const std::string directory = "/sys/devices/" + bus + "/block/" + name;
        file(directory + "/dev", number);
        file(directory + "/size", sectors);
        file("/sys/devices/" + bus + "/type", "0");
        file("/sys/devices/" + bus + "/state", "running");
        link(directory + "/device", "../../../" + bus.substr(bus.rfind('/') + 1));
        link("/sys/class/block/" + name, "../../.." + directory);
    }
    void partition(const std::string& holder, const std::string& name, const std::string& number) const {
        const std::string inside = host().resolved("/sys/class/block/" + holder).value_or("") + "/" + name;
        file(inside + "/dev", number);
        file(inside + "/partition", "1");
        file(inside + "/size", "1024");
        link("/sys/class/block/" + name, "../../.." + inside);
    }

    /// The host as root sees it; its devices are waited for as long as told, and what they say is not kept.
    hardware::Host asRoot(std::chrono::milliseconds patience = std::chrono::seconds(20),
                          std::chrono::milliseconds kept = std::chrono::milliseconds(0)) const {
        const hardware::Devices::Times times{patience, kept, kept, kept, kept};
        return hardware::Host(root(), true, std::make_shared<hardware::Devices>(devices, times));
    }
    hardware::Host asNobody() const {
        return hardware::Host(root(), false, std::make_shared<hardware::Devices>(devices));
    }

    const std::shared_ptr<FakeDevices> devices = std::make_shared<FakeDevices>();
};

/// The facts of one thing by the names of their properties, as texts.
inline std::map<std::string, std::string> factsOf(const hardware::Host& host, hardware::Class type,
                                                  const std::string& name) {
    std::map<std::string, std::string> facts;
    hardware::Found found{type, name};
    sourceOf(type).describe(host, found);
    for (const hardware::Row& row : sourceOf(type).rows) {
        const auto fact = found.facts.all().find(row.id);
        if (fact != found.facts.all().end()) {
            facts[row.name] = golden::text(fact->second);
        }
    }
    return facts;
}

}  // namespace hardware_test
