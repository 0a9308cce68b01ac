#include "plugins/hardware/sensor/chips.h"

#include <algorithm>
#include <array>
#include <cstdio>
#include <set>

namespace hardware {

namespace {

constexpr auto kAll = "/sys/class/hwmon/";

std::string hexadecimal(unsigned long long number) {
    std::array<char, 20> text{};
    std::snprintf(text.data(), text.size(), "%04llx", number);
    return text.data();
}

std::optional<unsigned int> hexadecimalAt(const std::string& text, std::size_t place, std::size_t length) {
    return place + length <= text.size() ? asNumber("0x" + text.substr(place, length)) : std::nullopt;
}

/// "0000:03:00.1": domain, bus, device and function in one number.
std::string pciPlace(const std::string& device) {
    const auto domain = hexadecimalAt(device, 0, 4);
    const auto bus = hexadecimalAt(device, 5, 2);
    const auto slot = hexadecimalAt(device, 8, 2);
    const auto function = hexadecimalAt(device, 11, 1);
    if (!domain || !bus || !slot || !function) {
        return "pci-" + device;
    }
    return "pci-" + hexadecimal((*domain << 16U) + (*bus << 8U) + (*slot << 3U) + *function);
}

/// "3-004c": bus and address.
std::string i2cPlace(const std::string& device) {
    const std::size_t dash = device.find('-');
    const auto address = dash == std::string::npos ? std::nullopt : hexadecimalAt(device, dash + 1, 4);
    std::array<char, 8> text{};
    std::snprintf(text.data(), text.size(), "%02x", address.value_or(0) & 0xffffU);
    return address ? "i2c-" + device.substr(0, dash) + "-" + text.data() : "i2c-" + device;
}

/// "coretemp.1": the number of the device.
std::string platformPlace(const std::string& device) {
    const std::size_t point = device.rfind('.');
    const auto number = point == std::string::npos ? std::nullopt : asNumber(device.substr(point + 1));
    return "isa-" + hexadecimal(number.value_or(0));
}

std::string placeOf(const Host& host, const std::string& directory) {
    const std::optional<std::string> device = host.resolved(directory + "/device");
    if (!device) {
        return "virtual-0";
    }
    const std::string name = device->substr(device->rfind('/') + 1);
    const std::string bus = host.target(directory + "/device/subsystem").value_or("");
    if (bus == "pci") {
        return pciPlace(name);
    }
    if (bus == "i2c") {
        return i2cPlace(name);
    }
    return bus == "platform" ? platformPlace(name) : (bus.empty() ? "virtual" : bus) + "-" + name;
}

}  // namespace

std::vector<Chip> chips(const Host& host) {
    std::vector<Chip> all;
    std::set<std::string> names;
    for (const std::string& entry : host.entries(kAll)) {
        const std::string directory = kAll + entry;
        const std::optional<std::string> sort = host.line(directory + "/name");
        if (!sort) {
            continue;
        }
        std::string name = *sort + "-" + placeOf(host, directory);
        std::replace(name.begin(), name.end(), '/', '!');
        while (!names.insert(name).second) {
            name += "+";  // two chips of a careless driver
        }
        all.push_back({name, directory});
    }
    return all;
}

std::optional<Chip> findChip(const Host& host, const std::string& name) {
    const std::vector<Chip> all = chips(host);
    const auto found =
        std::find_if(all.begin(), all.end(), [&](const Chip& chip) { return chip.name == name; });
    return found == all.end() ? std::nullopt : std::optional(*found);
}

}  // namespace hardware
