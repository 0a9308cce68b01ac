// The walk over the host's interfaces: a port node for each port, an IP configuration below it, its settings
// saved.
#include <utility>

#include "mi/log.h"
#include "mi/node_types.h"
#include "mi/text.h"
#include "network/dns.h"
#include "network/interface_lists.h"
#include "network/network_builder.h"
#include "network/port_node.h"
#include "network/port_walk.h"
#include "network/saved_settings.h"

namespace IC {

void NetworkBuilder::createNetworkPortNodes(bool /*update*/) {
    const LogScope scope;
    const std::lock_guard oneWalkAtATime(tree_.building);
    if (tree_.fixed.networkController == nullptr) {
        return;  // an agent that still holds a node writes to it after unload: there is no tree any more
    }
    try {
        walkInterfaces();
    } catch (const std::exception& failure) {
        logPortFailure(failure);
    }
}

void NetworkBuilder::walkInterfaces() {
    const std::vector<std::string> listing = PortWalk::list();
    std::vector<std::string> bridgeMembers;
    getbridgeInterfaces(bridgeMembers);
    HostFacts host{trimEnd(tree_.hostName), trimEnd(tree_.domainName), {}, {}};
    getDNSDetails(host.dnsServers, host.dnsSuffixes);
    dnsServers_ = host.dnsServers;
    dnsSuffixes_ = host.dnsSuffixes;
    std::string servers;
    std::string suffixes;
    stringFormatForDNSServersAndSuffixes(servers, suffixes);
    const std::map<std::string, std::string> shared = {{"HOSTNAME", host.hostName},
                                                       {"DOMAINNAME", host.domainName},
                                                       {"DNSSERVERS", servers},
                                                       {"DNSSUFFIXES", suffixes}};
    const std::set<std::string> bridges = PortWalk::bridgesOf(listing);
    PortWalk::logIPv6();
    const PortWalk walk(std::move(host), std::move(bridgeMembers));
    unsigned int index = 0;
    for (const std::string& line : listing) {
        try {
            visitInterface(PortWalk::interfaceOf(line, bridges), walk, shared, index);
        } catch (const std::exception& failure) {
            logPortFailure(failure);
        }
    }
}

void NetworkBuilder::visitInterface(const ListedInterface& interface, const PortWalk& walk,
                                    std::map<std::string, std::string> settings, unsigned int& index) {
    const std::string& name = interface.name;
    MutableNode* known = nullptr;
    if (tree_.findNetworkPort(name, &known) || walk.isBridgeMember(name) || walk.hasZeroAddress(name)) {
        return;
    }
    MutableNode* port = walk.isPort(name) ? createPort(name, index) : nullptr;
    MutableNode* config = nullptr;
    if (PortWalk::hasIPConfig(name)) {
        // What has no port of its own, a bond or a bridge, hangs under the controller.
        MutableNode& parent = port != nullptr ? *port : *tree_.fixed.networkController;
        config = createIPConfig(interface, parent, walk, ++index, settings);
    }
    if (MutableNode* node = port != nullptr ? port : config) {
        log(kProgress) << "Inserting the interface in the Map " << name;
        tree_.rememberByName(name, node);
    }
    settings.emplace("CONFIG_NAME", name);
    createSettingData(name, std::move(settings));
}

MutableNode* NetworkBuilder::createPort(const std::string& name, unsigned int index) {
    auto* port =
        tree_.makeNode<NetworkPortNode>(tree_.fixed.networkController, NodeType::networkPort, index, name);
    tree_.appendNode(port);
    port->setDescription("Network Port");
    port->fill();
    return port;
}

MutableNode* NetworkBuilder::createIPConfig(const ListedInterface& interface, const MutableNode& parent,
                                            const PortWalk& walk, unsigned int index,
                                            std::map<std::string, std::string>& settings) {
    log(kProgress) << "Creating an IPConfigNode for " << interface.name;
    auto* config = tree_.makeNode<IPConfigNode>(&parent, NodeType::ipConfiguration, index, interface.name);
    tree_.appendNode(config);
    log(kProgress) << "Size of Inteface  " << static_cast<unsigned int>(walk.bridgeMemberCount());
    config->setDescription(interface.isBridge ? "Bridge" : "IP Configuration");
    config->fill(walk.host(), settings);
    config->complete(this);
    return config;
}

}  // namespace IC
