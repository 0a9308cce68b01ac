#include <array>

#include "agent/keep/daemons.h"
#include "agent/keep/host_files.h"
#include "agent/keep/systems.h"

namespace cvagent::keep {

namespace {

/// What it says of links that it leaves alone, or has not looked at.
constexpr std::array kNotKept = {"", "unmanaged", "pending", "initialized"};

bool isGeneratedFromNetplan(const std::string& file) {
    return file.starts_with("/run/systemd/network/") && lastPart(file).starts_with("10-netplan-");
}

}  // namespace

/// Its state files outlive it, so it has to run, too.
std::optional<Claim> claimOfNetworkd(const Link& link, Daemons& daemons) {
    const auto told = smallFile("/run/systemd/netif/links/" + std::to_string(link.index));
    const std::string state = assigned(told.value_or(""), "ADMIN_STATE");
    const std::string file = assigned(told.value_or(""), "NETWORK_FILE");
    for (const char* other : kNotKept) {
        if (state == other) {
            return std::nullopt;
        }
    }
    if (file.empty() || !daemons.runs("org.freedesktop.network1", "systemd-networkd")) {
        return std::nullopt;
    }
    const bool isGenerated = isGeneratedFromNetplan(file);
    return Claim{
        isGenerated ? "netplan" : "systemd-networkd",
        "systemd-networkd says '" + state + "', by " + file + (isGenerated ? " that netplan has made" : ""),
        file};
}

}  // namespace cvagent::keep
