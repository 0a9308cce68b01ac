#include "network/esx.h"

#include <filesystem>

#include "mi/command.h"
#include "mi/log.h"

namespace IC {

namespace {

/// Runs a switch to its end.
bool flip(const Command& command) {
    return HostCommand(command).started();
}

bool turnOnIPv6() {
    // The tool takes its option after two blanks as well as after one.
    return flip("esxcfg-vswif -6 true") && flip("esxcfg-vmknic  -6 true");
}

}  // namespace

bool enableIPv6ForESX() {
    const Operation operation;
    log(kProgress) << "Entering enableIPv6ForESX";
    const bool enabled = turnOnIPv6();
    log(kProgress) << "enableIPv6ForESX Returned : " << enabled;
    return enabled;
}

bool checkESX4_1Release() {
    const LogScope scope("Entering checkESX4_1Release", "Exiting checkESX4_1Release");
    std::error_code unreadable;
    if (!std::filesystem::exists("/etc/vmware-release", unreadable)) {
        log(kProgress) << "Machine is not vmware";
        return false;
    }
    const FirstLine release = firstLine(formatCommand("cat /etc/vmware-release | grep 4"));
    if (release.started && !release.line) {
        log(kProgress) << "Machine is ESX 4.0";
    }
    return release.line.has_value();
}

void enableIPv6forRHEL() {}
void disablePeerDNS(std::string const&) {}
void executeGatewayChanges(std::string, std::string) {}

}  // namespace IC
