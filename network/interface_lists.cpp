#include "network/interface_lists.h"

#include "mi/log.h"
#include "network/link_parse.h"

namespace IC {

bool getNICString(const std::string& line, std::string& name) {
    const LogScope scope;
    parse::NICName found = parse::nicName(line);
    name = std::move(found.name);
    return !found.ofBridge;
}

bool getbridgeInterfaces(std::vector<std::string>& members) {
    const LogScope scope;
    HostCommand listing(formatCommand("brctl show | awk '{print $NF}' | grep -v interfaces"));
    bool any = false;
    while (const auto line = listing.nextLine()) {
        const std::string& member = members.emplace_back(parse::bridgeMember(*line));
        log(kProgress) << "getbridgeInterfaces: after" << member;
        any = true;
    }
    return any;
}

HostCommand bondMemberLines(const std::string& bond) {
    return HostCommand::fromText(
        textCommand("cat /proc/net/bonding/%s 2> /dev/null | grep \"Slave Interface:\"", bond));
}

bool getSlaveInterfaces(const std::string& bond, std::vector<std::string>& members) {
    const LogScope scope("Entering getSlaveInterfaces", "Exiting getSlaveInterfaces");
    HostCommand lines = bondMemberLines(bond);
    if (!lines.started()) {
        log(kError) << "isNICUp - grepping slave device error";
        return false;
    }
    while (const auto line = lines.nextLine()) {
        const std::string& member = members.emplace_back(parse::bondMember(*line));
        log(kProgress) << "Slave Found:" << member;
    }
    return true;
}

CEthernetPort* getVLANInterface(const EthernetPortsByName* vlans, std::string name) {
    const LogScope scope;
    if (vlans == nullptr) {
        return nullptr;
    }
    const auto found = vlans->find(name);
    return found == vlans->end() ? nullptr : found->second;
}

CEthernetPort* isPhysicalPort(const EthernetPortsByController* ports, std::string name) {
    const LogScope scope;
    for (const auto& [controller, portsOfController] : *ports) {
        for (CEthernetPort* port : *portsOfController) {
            if (port->name == name) {
                return port;
            }
        }
    }
    return nullptr;
}

}  // namespace IC
