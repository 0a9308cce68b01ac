#pragma once

#include <atomic>
#include <string>
#include <vector>

#include "framework/ic/mutable_node.h"

namespace IC {

class NetworkBuilder;

/// One interface's IP configuration. A read asks the host, a write changes it.
class IPConfigNode : public MutableNode {
public:
    enum PropertyId : unsigned int {
        ipOrigin = 24,              ///< enumeration: IPOrigin code; writing 1 or 3 edits the interface file
        ipv4Address = 25,           ///< text; written while the origin is fixed
        subnetMask = 26,            ///< text; written while the origin is fixed
        ipv6Address = 27,           ///< text; written while the origin is fixed
        ipv6AddressType = 28,       ///< enumeration
        ipv6InterfaceId = 29,       ///< text: fourth group of the IPv6 address
        protocol = 47,              ///< number: ProtocolCode
        reenumeratePorts = 74,      ///< number: writing 1 looks for new interfaces; never stored then
        dhcpServers = 93,           ///< list of texts
        dnsServers = 94,            ///< list of texts, the host's
        originsSupported = 95,      ///< list of numbers: 1, 3
        addressOrigin = 96,         ///< enumeration: 1 with a DHCP lease, else 3
        hostName = 97,              ///< text, the host's
        domainName = 98,            ///< text, the host's
        dnsSuffixes = 99,           ///< list of texts, the host's
        ipv4Gateway = 100,          ///< text; written while the origin is fixed
        ipv6Gateway = 101,          ///< text; written while the origin is fixed
        ipv6PrefixLength = 102,     ///< number of bits; written while the origin is fixed
        interfaceName = 108,        ///< text
        interfaceLabel = 121,       ///< text: the name again
        linkState = 123,            ///< number: 1 up, 12 down; written: 1 or 9 up, 12 or 16 down
        linkStatesSupported = 125,  ///< list of numbers: 0, 1, 12
        usesDhcp = 186,             ///< boolean: a DHCP lease file exists
    };

    /// @param name the interface's
    IPConfigNode(unsigned int nodeId, unsigned int linkedId, std::vector<unsigned int> miIds,
                 unsigned int nodeType, unsigned int index, std::string name);
    ~IPConfigNode() override;

    const std::string& name() const { return name_; }
    /// Asks the host for what it can change at any time, the store for the rest. Always a success for the
    /// former: a tool that answers nothing gives an empty text, 0, or 12 for the link state.
    Error getProperty(unsigned int id, PropertyValue& value) const override;
    /// Changes the host, then stores the value. Always a success; failures are only logged.
    /// Until the plug-in has started, and until the builder has said that the node is complete, values are
    /// only stored: the builder's own filling must never change the host.
    Error setProperty(const unsigned int& id, const PropertyValue& value) override;

    /// The builder is done; from now on writes act on the host, and it is who looks for new interfaces.
    void complete(NetworkBuilder* builder) { builder_ = builder; }
    NetworkBuilder* builder() const { return builder_; }  ///< null until the node is complete

private:
    const std::string name_;
    std::atomic<NetworkBuilder*> builder_{nullptr};
};

/// The IPOrigin code of a BOOTPROTO keyword: 1 for "dhcp" and "dhcp4", 3 for "static" and "none", 2 for
/// "bootp", 0 for any other.
unsigned int originOfKeyword(const std::string& keyword);

}  // namespace IC
