#pragma once

#include <atomic>
#include <map>
#include <string>
#include <vector>

#include "framework/netinfo/records.h"
#include "mi/host_node.h"

namespace IC {

/// What every interface of the host shares, read once for a walk over the interfaces.
struct HostFacts {
    std::string hostName;
    std::string domainName;
    std::vector<std::string> dnsServers;
    std::vector<std::string> dnsSuffixes;
};

class NetworkBuilder;

extern const NodeClass ipConfigClass;

/// One interface's IP configuration: a read asks the host, a write changes it. Its name is the interface's. A
/// tool that answers nothing gives an empty text, 0, or LinkState::down.
class IPConfigNode : public NodeOf<ipConfigClass> {
public:
    using NodeOf::NodeOf;

    /// Changes the host, then stores the value. Always a success; failures are only logged.
    /// Until the plug-in has started, and until the node is complete, values are only stored: filling it must
    /// never change the host.
    Error setProperty(const unsigned int& id, const PropertyValue& value) override;

    /// Filling is over; from now on writes act on the host, and it is `builder` that looks for new
    /// interfaces.
    void complete(NetworkBuilder* builder) { builder_ = builder; }
    NetworkBuilder* builder() const { return builder_; }  ///< null until the node is complete

    /// Asks the host for everything an IP configuration shows and stores it.
    /// @param settings receives what is saved of the interface: its addresses, gateways and boot protocol
    void fill(const HostFacts& host, std::map<std::string, std::string>& settings);
    /// Stores the names and one address, without asking the host.
    void fill(const CIPInfo& address);

private:
    std::atomic<NetworkBuilder*> builder_{nullptr};
};

}  // namespace IC
