#include "hosttools/applet.h"

namespace hosttools {
namespace {

constexpr Applet all[] = {
    {"fdisk", runFdisk, "fdisk -l[su] [DISK]..."},
    {"ifconfig", runIfconfig,
     "ifconfig [-a] [INTERFACE [up|down|ADDRESS|netmask MASK|broadcast ADDRESS|pointopoint ADDRESS]...]"},
    {"route", runRoute,
     "route [-A inet6] -n\n"
     "  route add|del -host A|-net A netmask M|default [gw G] [metric N] [[dev] INTERFACE]"},
};

}  // namespace

int Host::interfaces(std::string_view only, std::shared_ptr<const Interfaces>& found) {
    const auto read = std::make_shared<Interfaces>();
    found = read;
    return readInterfaces(only, *read);
}

std::optional<std::vector<Disk>> Host::disks() {
    return listDisks("");
}

void Answer::complain(std::string_view tool, std::string_view message) {
    errors.add(tool).add(": ").add(message).add('\n');
}

std::span<const Applet> applets() {
    return all;
}

const Applet* findApplet(std::string_view name) {
    for (const Applet& applet : all) {
        if (name == applet.name) return &applet;
    }
    return nullptr;
}

}  // namespace hosttools
