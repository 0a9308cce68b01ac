#pragma once

#include <exception>
#include <set>
#include <string>
#include <vector>

#include "framework/netinfo/ip_interface_info.h"
#include "framework/netinfo/network_info.h"
#include "network/ip_config_node.h"

namespace IC {

/// A line of the interface listing.
struct ListedInterface {
    std::string name;
    bool isBridge;  ///< names a row of `brctl show`, wherever it was listed first
};

/// The output of `ifconfig`, kept in ifconfigSnapshotPath for the length of a walk.
class IfconfigSnapshot {
public:
    IfconfigSnapshot();
    IfconfigSnapshot(const IfconfigSnapshot&) = delete;
    IfconfigSnapshot& operator=(const IfconfigSnapshot&) = delete;
    ~IfconfigSnapshot();
};

/// What one walk over the host's interfaces has to hand: the same for every interface.
class PortWalk {
public:
    /// Takes the output of `ifconfig` first, then reads the kernel's ports and VLANs.
    PortWalk(HostFacts host, std::vector<std::string> bridgeMembers);

    /// The lines of the listing of all interfaces, in the order the host prints them.
    static std::vector<std::string> list();
    /// The names in the first column of the bridges' rows.
    static std::set<std::string> bridgesOf(const std::vector<std::string>& listing);
    static ListedInterface interfaceOf(const std::string& line, const std::set<std::string>& bridges);
    /// Logs whether the kernel has IPv6.
    static void logIPv6();

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
    IfconfigSnapshot snapshot_;
    CNetworkInfo network_{true};
    CIPInterfaceInfo interfaces_;
};

/// Logs what went wrong on a walk, which nobody else hears of.
void logPortFailure(const std::exception& failure);

}  // namespace IC
