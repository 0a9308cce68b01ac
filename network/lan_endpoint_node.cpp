#include "network/lan_endpoint_node.h"

#include <utility>

#include "framework/netinfo/ip_interface_info.h"
#include "mi/log.h"
#include "mi/node_types.h"
#include "mi/text.h"
#include "network/ip_config_node.h"
#include "network/network_builder.h"

namespace IC {

namespace {

void storeAddress(IPConfigNode& node, const CIPInfo& address) {
    node.setProperty(IPConfigNode::interfaceName, {node.name(), true});
    node.setProperty(IPConfigNode::interfaceLabel, {node.name(), true});
    if (address.ipv6) {
        node.setProperty(IPConfigNode::ipv6Address, {address.address, true});
        node.setProperty(IPConfigNode::ipv6PrefixLength, {Number(address.prefixLength), true});
    } else {
        node.setProperty(IPConfigNode::ipv4Address, {address.address, true});
        node.setProperty(IPConfigNode::subnetMask, {address.mask, true});
    }
}

CLANEndPointNode* createLANEndPoint(NodeTree& tree, const std::string& name, unsigned int parent,
                                    unsigned int index) {
    auto* node =
        new CLANEndPointNode(tree.drawNodeId(), parent, tree.miIds(), NodeType::lanEndPoint, index, name);
    tree.appendNode(node);
    node->setDescription("LAN EndPoint node");
    node->setStatus(1);
    node->setProperty(CLANEndPointNode::interfaceName, {name, true});
    return node;
}

}  // namespace

std::map<std::string, CEthernetPort*>* m_mapEthernetPorts = nullptr;

CLANEndPointNode::CLANEndPointNode(unsigned int nodeId, unsigned int linkedId,
                                   std::vector<unsigned int> miIds, unsigned int nodeType, unsigned int index,
                                   std::string name)
    : MutableNode(nodeId, linkedId, std::move(miIds), nodeType, index), name_(std::move(name)) {
    const LogScope scope("CLANEndPointNode::CLANEndPointNode");
}

CLANEndPointNode::~CLANEndPointNode() {
    const LogScope scope("CLANEndPointNode::~CLANEndPointNode");
}

Error CLANEndPointNode::getProperty(unsigned int id, PropertyValue& value) const {
    const LogScope scope("CLANEndPointNode::getProperty");
    return MutableNode::getProperty(id, value);
}

Error CLANEndPointNode::setProperty(const unsigned int& id, const PropertyValue& value) {
    const LogScope scope("CLANEndPointNode::setProperty");
    return MutableNode::setProperty(id, value);
}

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
        config->setStatus(1);
        storeAddress(*config, *address);
        config->complete(this);
    }
}

}  // namespace IC
