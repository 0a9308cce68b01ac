#pragma once

#include <map>
#include <string>
#include <vector>

#include "network/ip_config_node.h"

namespace IC {

/// What every interface of the host shares, read once for a walk over the interfaces.
struct HostFacts {
    std::string hostName;
    std::string domainName;
    std::vector<std::string> dnsServers;
    std::vector<std::string> dnsSuffixes;
};

/// Asks the host for everything an IP configuration shows and stores it in the node.
/// @param settings receives what is saved of the interface: its addresses, gateways and boot protocol
void fillIPConfig(IPConfigNode& node, const HostFacts& host, std::map<std::string, std::string>& settings);

}  // namespace IC
