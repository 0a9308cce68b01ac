#include "plugins/hardware/system/system.h"

namespace hardware {

namespace {

enum : Id {
    maker = firstId(Class::system) + 1,
    model,
    serial,
    uuid,
    firmwareVersion,
    firmwareDate,
    bootTime,
    kernel,
    distribution,
};

constexpr auto kType = Class::system;
constexpr Row kRows[] = {
    {kType, maker, "Maker", Kind::text, "", "/sys/class/dmi/id/sys_vendor", "who made the computer"},
    {kType, model, "Model", Kind::text, "", "/sys/class/dmi/id/product_name", "the computer's model"},
    {kType, serial, "Serial", Kind::text, "", "/sys/class/dmi/id/product_serial", "the serial number",
     Audience::trusted},
    {kType, uuid, "UUID", Kind::text, "", "/sys/class/dmi/id/product_uuid",
     "the number no other computer has", Audience::trusted},
    {kType, firmwareVersion, "FirmwareVersion", Kind::text, "", "/sys/class/dmi/id/bios_version",
     "version of the firmware"},
    {kType, firmwareDate, "FirmwareDate", Kind::text, "", "/sys/class/dmi/id/bios_date",
     "when the firmware was made, as it says it"},
    {kType, bootTime, "BootTime", Kind::number, "seconds since 1970", "btime in /proc/stat",
     "when the host was started"},
    {kType, kernel, "Kernel", Kind::text, "", "/proc/sys/kernel/osrelease", "release of the running kernel"},
    {kType, distribution, "Distribution", Kind::text, "", "PRETTY_NAME in /etc/os-release",
     "the system installed"},
};

std::optional<unsigned long long> bootTimeOf(const Host& host) {
    for (const std::string& line : host.lines("/proc/stat")) {
        if (line.starts_with("btime ")) {
            return asNumber(trimmed(line.substr(6)));
        }
    }
    return std::nullopt;
}

}  // namespace

Rows systemRows() {
    return kRows;
}

std::vector<std::string> listSystem(const Host& /*host*/) {
    return {""};
}

void describeSystem(const Host& host, Found& found) {
    const std::string dmi = "/sys/class/dmi/id/";
    Facts& facts = found.facts;
    facts.text(maker, host.line(dmi + "sys_vendor"));
    facts.text(model, host.line(dmi + "product_name"));
    if (host.privileged()) {
        facts.text(serial, host.line(dmi + "product_serial"));
        facts.text(uuid, host.line(dmi + "product_uuid"));
    }
    facts.text(firmwareVersion, host.line(dmi + "bios_version"));
    facts.text(firmwareDate, host.line(dmi + "bios_date"));
    facts.number(bootTime, bootTimeOf(host));
    facts.text(kernel, host.line("/proc/sys/kernel/osrelease"));
}

}  // namespace hardware
