#include "hosttools/applet.h"

namespace hosttools {
namespace {

constexpr Applet all[] = {
    {"brctl", runBrctl, "brctl show"},
    {"egrep", runEgrep, "egrep 'eth|bond|usb' /proc/net/dev"},
    {"ethtool", runEthtool, "ethtool INTERFACE"},
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

int Answer::leaveToHost(std::string_view tool, std::string_view word) {
    beyond = true;
    complain(tool, Text().add("not done here: '").add(word).add("', and there is no other ").add(tool));
    return 1;
}

std::string_view firstOf(Arguments words) {
    return words.empty() ? std::string_view() : words.front();
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
