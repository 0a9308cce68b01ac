#include "network/lan_endpoint_node.h"

#include "framework/netinfo/ip_interface_info.h"
#include "mi/log.h"
#include "mi/node_types.h"
#include "mi/text.h"
#include "network/ip_config_node.h"
#include "network/network_builder.h"

namespace IC {

constinit const NodeClass lanEndPointClass{"~CLANEndPointNode"};

namespace {

CLANEndPointNode* createLANEndPoint(NodeTree& tree, const std::string& name, unsigned int parent,
                                    unsigned int index) {
    auto* node =
        new CLANEndPointNode(tree.drawNodeId(), parent, tree.miIds(), NodeType::lanEndPoint, index, name);
    tree.appendNode(node);
    node->setDescription("LAN EndPoint node");
    node->setStatus(kStatusGood);
    constexpr unsigned int kInterfaceName = 108;
    node->setProperty(kInterfaceName, {name, true});
    return node;
}

}  // namespace

std::map<std::string, CEthernetPort*>* m_mapEthernetPorts = nullptr;

bool getParentLANEndPointNode(std::string name, unsigned int& id) {
    const std::string entry = "In getParentLANEndPointNode " + name;
    const LogScope scope(entry.c_str(), "getParentLANEndPointNode: exit");
    if (m_mapEthernetPorts == nullptr) {
        return false;
    }
    const auto port = m_mapEthernetPorts->find(name.substr(0, name.rfind('#')));
    if (port == m_mapEthernetPorts->end()) {
        return false;
    }
    id = port->second->nodeId;
    return true;
}

void NetworkBuilder::createLANEndPointNodes() {
    const LogScope scope("In OsHwMI::createLANEndPointNodes", "Exit OsHwMI::createLANEndPointNodes");
    CIPInterfaceInfo interfaces;
    const IPInfoByInterface* addresses = interfaces.getInterfaceIPsInfo();
    if (addresses == nullptr) {
        log(kError) << "OsHwMI::createLANEndPointNodes, not able to get IPInfo";
        return;
    }
    log(kProgress) << "OsHwMI::createLANEndPointNodes, Size is: "
                   << static_cast<unsigned int>(addresses->size());
    unsigned int endPoints = 0;
    unsigned int configs = 0;
    for (const auto& [name, ofInterface] : *addresses) {
        CLANEndPointNode* endPoint =
            createLANEndPoint(tree_, name, idOf(tree_.fixed.networkController), ++endPoints);
        std::vector<CIPInfo*> infos = ofInterface;
        createIPConfigNodes(&infos, name, endPoint, configs);
    }
    for (const auto& [name, ofInterface] : *addresses) {
        unsigned int parent = 0;
        if (contains(name, "#") && getParentLANEndPointNode(name, parent)) {
            createLANEndPoint(tree_, name, parent, ++endPoints);
        }
    }
}

void NetworkBuilder::createIPConfigNodes(std::vector<CIPInfo*>* addresses, std::string name,
                                         MutableNode* parent, unsigned int& index) {
    const LogScope scope;
    for (const CIPInfo* address : *addresses) {
        auto* config = tree_.makeNode<IPConfigNode>(parent, NodeType::ipConfiguration, ++index, name);
        tree_.appendNode(config);
        config->setDescription("IP Configuration");
        config->setStatus(kStatusGood);
        config->fill(*address);
        config->complete(this);
    }
}

}  // namespace IC
