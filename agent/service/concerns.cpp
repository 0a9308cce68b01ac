#include "agent/service/concerns.h"

#include <algorithm>
#include <iterator>

#include "agent/service/host_links.h"

namespace cvagent::service {

namespace {

struct ConcernRow {
    NodeType nodeClass;
    unsigned int property;
    unsigned int concern;  // any of these
};

constexpr unsigned int kAddresses = concernsLink | concernsAddress;
constexpr unsigned int kGateways = concernsAll;
constexpr unsigned int kLease = kAddresses | concernsHost;

// What the first plug-in reads of the kernel and of the host's files. 24 is in a file, too, but who gets an
// address otherwise has it by then.
constexpr ConcernRow kConcernRows[] = {
    {NodeType::networkPort, 38, concernsLink},   // SupportedSpeed
    {NodeType::networkPort, 57, concernsLink},   // LinkSpeed
    {NodeType::networkPort, 67, concernsLink},   // AutoNegotiation
    {NodeType::networkPort, 82, concernsLink},   // FullDuplex
    {NodeType::networkPort, 123, concernsLink},  // LinkState
    {NodeType::networkPort, 182, concernsLink},  // WakeOnLanSupported
    {NodeType::networkPort, 183, concernsLink},  // WakeOnLanEnabled
    {NodeType::networkPort, 185, concernsLink},  // PortType
    {NodeType::networkPort, 193, concernsLink},  // IsTeamMember
    {NodeType::networkPort, 194, concernsLink},  // IsActiveMember
    {NodeType::networkPort, 195, concernsLink},  // MemberLinkStatus
    {NodeType::networkPort, 196, concernsLink},  // MemberLinkFailures
    {NodeType::networkPort, 199, concernsLink},  // TeamName
    {NodeType::ipConfig, 24, kAddresses},        // IPOrigin
    {NodeType::ipConfig, 25, kAddresses},        // IPv4Address
    {NodeType::ipConfig, 26, kAddresses},        // SubnetMask
    {NodeType::ipConfig, 27, kAddresses},        // IPv6Address
    {NodeType::ipConfig, 28, kAddresses},        // IPv6AddressType
    {NodeType::ipConfig, 29, kAddresses},        // IPv6InterfaceId
    {NodeType::ipConfig, 47, kAddresses},        // Protocol
    {NodeType::ipConfig, 93, concernsHost},      // DHCPServers
    {NodeType::ipConfig, 94, concernsHost},      // DNSServers
    {NodeType::ipConfig, 96, kLease},            // AddressOrigin
    {NodeType::ipConfig, 97, concernsHost},      // HostName
    {NodeType::ipConfig, 98, concernsHost},      // DomainName
    {NodeType::ipConfig, 99, concernsHost},      // DNSSuffixes
    {NodeType::ipConfig, 100, kGateways},        // IPv4Gateway
    {NodeType::ipConfig, 101, kGateways},        // IPv6Gateway
    {NodeType::ipConfig, 102, kAddresses},       // IPv6PrefixLength
    {NodeType::ipConfig, 123, concernsLink},     // InterfaceState
    {NodeType::ipConfig, 186, kLease},           // UsesDHCP
    {NodeType::computer, 108, concernsHost},     // HostName
    {NodeType::computer, 127, concernsHost},     // TimeZoneOffset
    {NodeType::team, 165, concernsLink},         // MemberPorts
    {NodeType::team, 197, concernsLink},         // TeamName
    {NodeType::team, 198, concernsLink},         // TeamMode
};

constexpr const char* kOfDrives[] = {"drive", "drive-part", "file-system", "array", "mapping"};

}  // namespace

bool looksByItself(const std::string& nodeClass, unsigned int concern, bool drives) {
    return ((concern & concernsLink) != 0 && nodeClass == "link") ||
           (drives && std::ranges::find(kOfDrives, nodeClass) != std::end(kOfDrives));
}

std::vector<unsigned int> concernedProperties(unsigned int nodeType, unsigned int concern) {
    std::vector<unsigned int> properties;
    for (const ConcernRow& row : kConcernRows) {
        if (static_cast<unsigned int>(row.nodeClass) == nodeType && (row.concern & concern) != 0) {
            properties.push_back(row.property);
        }
    }
    return properties;
}

}  // namespace cvagent::service
