#include "plugins/hardware/sensor/chips.h"

#include <algorithm>
#include <array>
#include <charconv>
#include <set>
#include <string_view>

namespace hardware {

namespace {

constexpr auto kAll = "/sys/class/hwmon/";

/// A number of hexadecimal digits without anything before them.
std::optional<unsigned int> hexadecimal(const std::string& text) {
    const auto number = text.empty() || text.size() > 8 ? std::nullopt : asNumber("0x" + text);
    return number ? std::optional(static_cast<unsigned int>(*number)) : std::nullopt;
}

/// The pieces between any of the separators.
std::vector<std::string> pieces(const std::string& text, const char* separators) {
    std::vector<std::string> all;
    for (std::size_t at = 0; at <= text.size();) {
        const std::size_t end = std::min(text.find_first_of(separators, at), text.size());
        all.push_back(text.substr(at, end - at));
        at = end + 1;
    }
    return all;
}

/// In hexadecimal digits, with zeros before them up to the width.
std::string digits(unsigned int number, std::size_t width = 1) {
    std::array<char, 9> text{};
    const std::string all(text.data(), std::to_chars(text.begin(), text.end(), number, 16).ptr);
    return std::string(width - std::min(width, all.size()), '0') + all;
}

/// "0000:03:00.1": domain, bus, device and function in one number.
std::string pciPlace(const std::string& device) {
    const std::vector<std::string> parts = pieces(device, ":.");
    unsigned int place = 0;
    constexpr std::array<unsigned int, 4> kShifts = {16, 8, 3, 0};
    for (std::size_t part = 0; part < std::min(parts.size(), kShifts.size()); ++part) {
        place += hexadecimal(parts[part]).value_or(0) << kShifts[part];
    }
    return "pci-" + digits(place, 4);
}

/// "3-004c": bus and address.
std::string i2cPlace(const std::string& device) {
    const std::size_t dash = std::min(device.find('-'), device.size());
    const auto address = hexadecimal(device.substr(std::min(dash + 1, device.size())));
    return "i2c-" + device.substr(0, dash) + "-" + digits(address.value_or(0), 2);
}

/// "coretemp.1": the number of the device.
std::string platformPlace(const std::string& device) {
    const auto number = asNumber(pieces(device, ".").back());
    return "isa-" + digits(static_cast<unsigned int>(number.value_or(0)), 4);
}

/// "spi0.1": bus and chip select.
std::string spiPlace(const std::string& device) {
    const std::vector<std::string> parts = pieces(device, ".");
    return "spi-" + parts.front().substr(std::min<std::size_t>(3, parts.front().size())) + "-" +
           digits(hexadecimal(parts.back()).value_or(0));
}

/// "0:0:3:2": host, channel, target and unit.
std::string scsiPlace(const std::string& device) {
    std::vector<std::string> parts = pieces(device, ":");
    parts.resize(4);
    const auto number = [&parts](std::size_t part) {
        return static_cast<unsigned int>(asNumber(parts[part]).value_or(0));
    };
    return "scsi-" + parts.front() + "-" + digits((number(1) << 8U) + (number(2) << 4U) + number(3));
}

/// "0003:1B1C:0C10.0001": bus, and the number of the device.
std::string hidPlace(const std::string& device) {
    const std::vector<std::string> parts = pieces(device, ":.");
    return "hid-" + std::to_string(hexadecimal(parts.front()).value_or(0)) + "-" +
           digits(hexadecimal(parts.back()).value_or(0));
}

struct Bus {
    std::string_view name;
    std::string (*place)(const std::string& device);
};

constexpr std::array<Bus, 9> kBuses = {
    {{"pci", pciPlace},
     {"i2c", i2cPlace},
     {"platform", platformPlace},
     {"of_platform", platformPlace},
     {"spi", spiPlace},
     {"scsi", scsiPlace},
     {"hid", hidPlace},
     {"acpi", [](const std::string&) { return std::string("acpi-0"); }},
     {"mdio_bus", [](const std::string&) { return std::string("mdio-0"); }}}};

/// Where a chip sits, as those tools write it that people compare with. A device of a class (a battery, an
/// NVMe controller) sits on the bus of the device that it belongs to.
std::string placeOf(const Host& host, const std::string& directory) {
    constexpr int kMostSteps = 4;
    std::string way = directory;
    for (int step = 0; step < kMostSteps; ++step) {
        way += "/device";
        const std::optional<std::string> device = host.resolved(way);
        const std::string name = host.target(way + "/subsystem").value_or("");
        const auto bus =
            std::find_if(kBuses.begin(), kBuses.end(), [&name](const Bus& one) { return one.name == name; });
        if (device && bus != kBuses.end()) {
            return bus->place(device->substr(device->rfind('/') + 1));
        }
    }
    return "virtual-0";
}

/// Those whose sort a name can begin with: where they sit is not looked up for all the others.
std::vector<Chip> chipsNamedLike(const Host& host, const std::optional<std::string>& wanted) {
    std::vector<Chip> all;
    std::set<std::string> names;
    for (const std::string& entry : host.entries(kAll)) {
        const std::string directory = kAll + entry;
        const std::optional<std::string> sort = host.line(directory + "/name");
        std::string name = sort.value_or("") + "-";
        std::replace(name.begin(), name.end(), '/', '!');
        if (!sort || (wanted && !wanted->starts_with(name))) {
            continue;
        }
        name += placeOf(host, directory);
        while (!names.insert(name).second) {
            name += "+";  // two chips of a careless driver
        }
        all.push_back({name, *sort, directory});
    }
    return all;
}

}  // namespace

std::vector<Chip> chips(const Host& host) {
    return chipsNamedLike(host, std::nullopt);
}

std::optional<Chip> findChip(const Host& host, const std::string& name) {
    const std::vector<Chip> all = chipsNamedLike(host, name);
    const auto found =
        std::find_if(all.begin(), all.end(), [&](const Chip& chip) { return chip.name == name; });
    return found == all.end() ? std::nullopt : std::optional(*found);
}

}  // namespace hardware
