#include "plugins/hardware/system/system.h"

#include <sys/utsname.h>

#include <algorithm>
#include <array>
#include <iterator>
#include <string_view>

#include "plugins/hardware/memory/smbios.h"
#include "plugins/hardware/processor/processors.h"

namespace hardware {

namespace {

constexpr auto kType = Class::system;

enum : Id {
    kMaker = firstId(kType) + 1,
    kModel,
    kSerial,
    kUuid,
    kFirmwareVersion,
    kFirmwareDate,
    kVirtual,
    kVirtualKind,
    kBootTime,
    kKernel,
    kArchitecture,
    kDistribution,
    kSockets,
};

constexpr Row kRows[] = {
    {kMaker, "Maker", Kind::text, "", "/sys/class/dmi/id/sys_vendor", "who made the computer"},
    {kModel, "Model", Kind::text, "", "/sys/class/dmi/id/product_name or /proc/device-tree/model",
     "the computer's model"},
    {kSerial, "SerialNumber", Kind::text, "",
     "/sys/class/dmi/id/product_serial or /proc/device-tree/serial-number", "the computer's serial number",
     kTrusted},
    {kUuid, "UUID", Kind::text, "", "/sys/class/dmi/id/product_uuid", "the number that no other computer has",
     kTrusted},
    {kFirmwareVersion, "FirmwareVersion", Kind::text, "", "/sys/class/dmi/id/bios_version",
     "version of the firmware"},
    {kFirmwareDate, "FirmwareDate", Kind::text, "", "/sys/class/dmi/id/bios_date",
     "when the firmware was made, as it says it"},
    {kVirtual, "Virtual", Kind::flag, "", "flags in /proc/cpuinfo, /sys/class/dmi/id, /sys/hypervisor",
     "whether the computer is a virtual machine"},
    {kVirtualKind, "VirtualKind", Kind::text, "", "/sys/class/dmi/id, /sys/hypervisor/type",
     "what runs the virtual machine"},
    {kBootTime, "BootTime", Kind::number, "seconds since 1970", "btime in /proc/stat",
     "when the host was started"},
    {kKernel, "Kernel", Kind::text, "", "/proc/sys/kernel/osrelease", "release of the running kernel"},
    {kArchitecture, "Architecture", Kind::text, "", "/proc/sys/kernel/arch", "what the kernel was made for"},
    {kDistribution, "Distribution", Kind::text, "", "PRETTY_NAME in /etc/os-release",
     "the operating system as it calls itself"},
    {kSockets, "ProcessorSockets", Kind::number, "",
     "/sys/devices/system/cpu/cpu*/topology/physical_package_id", "sockets that hold a processor"},
};

/// A value out of a file for a shell, its quotes and backslashes taken off.
std::string unquoted(const std::string& text) {
    std::string value;
    for (std::size_t at = 0; at < text.size(); ++at) {
        if (text[at] == '\\' && at + 1 < text.size()) {
            value += text[++at];
        } else if (text[at] != '"' && text[at] != '\'') {
            value += text[at];
        }
    }
    return value;
}

/// By the first of its two places.
std::string distribution(const Host& host) {
    constexpr const char* kKey = "PRETTY_NAME";
    const auto name =
        firstTold({host.field("/etc/os-release", kKey), host.field("/usr/lib/os-release", kKey)});
    return unquoted(name.value_or(""));
}

std::optional<unsigned long long> bootTime(const Host& host) {
    for (const std::string& line : host.lines("/proc/stat")) {
        if (line.starts_with("btime ")) {
            return asNumber(trimmed(line.substr(6)));
        }
    }
    return std::nullopt;
}

struct Hypervisor {
    std::string_view told;  ///< how the maker or the model begins
    const char* name;
    bool alsoOfMachines = false;  ///< they give out whole machines, too: the processor decides
};

constexpr std::array<Hypervisor, 12> kHypervisors = {{{"QEMU", "QEMU"},
                                                      {"KVM", "KVM"},
                                                      {"VMware", "VMware"},
                                                      {"VirtualBox", "VirtualBox"},
                                                      {"Virtual Machine", "Hyper-V"},
                                                      {"Xen", "Xen"},
                                                      {"HVM domU", "Xen"},
                                                      {"Bochs", "Bochs"},
                                                      {"Parallels", "Parallels"},
                                                      {"Google Compute Engine", "KVM", true},
                                                      {"Amazon EC2", "KVM", true},
                                                      {"OpenStack", "KVM", true}}};

/// The processor says so itself, on x86; nothing where nobody tells.
std::optional<bool> processorIsVirtual(const Host& host) {
    for (const std::string& line : host.lines("/proc/cpuinfo")) {
        if (line.starts_with("flags")) {
            return (line + " ").find(" hypervisor ") != std::string::npos;
        }
    }
    return std::nullopt;
}

std::optional<std::string> virtualKind(const Host& host, std::optional<bool> processor) {
    if (const auto type = host.line("/sys/hypervisor/type")) {
        // The first domain drives the hardware: it is no guest.
        const bool guest =
            host.line("/proc/xen/capabilities").value_or("").find("control_d") == std::string::npos;
        return !guest ? std::nullopt : *type == "xen" ? "Xen" : type;
    }
    for (const char* file : {"product_name", "sys_vendor", "bios_vendor"}) {
        const std::string told = host.line(std::string("/sys/class/dmi/id/") + file).value_or("");
        const auto known = std::find_if(kHypervisors.begin(), kHypervisors.end(), [&](const Hypervisor& one) {
            return told.starts_with(one.told) && (!one.alsoOfMachines || processor == true);
        });
        if (known != kHypervisors.end()) {
            return known->name;
        }
    }
    return std::nullopt;
}

/// A number that nobody has filled in is all 0 or all F.
std::optional<std::string> uuidOf(const Host& host) {
    const auto uuid = host.line("/sys/class/dmi/id/product_uuid");
    const bool told = uuid && uuid->find_first_not_of("0-") != std::string::npos &&
                      uuid->find_first_not_of("Ff-") != std::string::npos;
    return told ? uuid : std::nullopt;
}

std::optional<std::string> architecture(const Host& host) {
    auto told = host.line("/proc/sys/kernel/arch");
    utsname names{};
    if (!told && host.live() && uname(&names) == 0) {  // kernels before 6.1 have no such file
        told = std::string(std::begin(names.machine));
    }
    return told;
}

}  // namespace

Rows systemRows() {
    return kRows;
}

std::vector<std::string> listSystem(const Host& /*host*/) {
    return {""};
}

void describeSystem(const Host& host, Found& found) {
    const auto dmi = [&host](const char* file) {
        return firmwareText(host.line(std::string("/sys/class/dmi/id/") + file));
    };
    const std::string tree = "/proc/device-tree/";
    Facts& facts = found.facts;
    facts.text(kMaker, dmi("sys_vendor"));
    facts.text(kModel, firstTold({dmi("product_name"), host.line(tree + "model")}));
    if (host.privileged()) {
        facts.text(kSerial, firstTold({dmi("product_serial"), host.line(tree + "serial-number")}));
        facts.text(kUuid, uuidOf(host));
    }
    facts.text(kFirmwareVersion, dmi("bios_version"));
    facts.text(kFirmwareDate, dmi("bios_date"));
    const std::optional<bool> processor = processorIsVirtual(host);
    const std::optional<std::string> kind = virtualKind(host, processor);
    facts.flag(kVirtual, kind ? std::optional(true) : processor);
    facts.text(kVirtualKind, kind);
    facts.number(kBootTime, bootTime(host));
    facts.text(kKernel, host.line("/proc/sys/kernel/osrelease"));
    facts.text(kArchitecture, architecture(host));
    facts.text(kDistribution, distribution(host));
    if (const std::size_t sockets = listProcessors(host).size(); sockets > 0) {
        facts.number(kSockets, sockets);
    }
}

}  // namespace hardware
