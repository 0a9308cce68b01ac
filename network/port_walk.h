#pragma once

#include <exception>
#include <string>
#include <vector>

#include "framework/netinfo/ip_interface_info.h"
#include "framework/netinfo/network_info.h"
#include "network/ip_config_builder.h"

namespace IC {

/// A line of the interface listing.
struct ListedInterface {
    std::string name;
    bool fromBridgeListing;  ///< from `brctl show`, as opposed to /proc/net/dev
};

/// What one walk over the host's interfaces has to hand: read at its start, the same for every interface.
class PortWalk {
public:
    /// Reads the bridge members, the resolver, the kernel's ports and VLANs, and keeps the output of
    /// `ifconfig` for the length of the walk.
    PortWalk(std::string hostName, std::string domainName);
    PortWalk(const PortWalk&) = delete;
    PortWalk& operator=(const PortWalk&) = delete;
    ~PortWalk();

    /// The interfaces in the order the host lists them, names as they come.
    static std::vector<ListedInterface> list();

    bool isBridgeMember(const std::string& name) const;
    /// No hardware address of its own: not an interface anybody can use.
    bool hasZeroAddress(const std::string& name) const;
    /// Whether the interface gets a port node: a physical port, a VLAN or a VMware NIC.
    bool isPort(const std::string& name) const;
    /// Whether `ifconfig -a` prints a line for it.
    static bool hasIPConfig(const std::string& name);

    const HostFacts& host() const { return host_; }
    std::size_t bridgeMemberCount() const { return bridgeMembers_.size(); }

private:
    HostFacts host_;
    std::vector<std::string> bridgeMembers_;
    CNetworkInfo network_{true};
    CIPInterfaceInfo interfaces_;
};

/// Logs what went wrong on a walk, which nobody else hears of.
void logPortFailure(const std::exception& failure, const char* function = __builtin_FUNCTION());

}  // namespace IC
