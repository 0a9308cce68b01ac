#include "network/team_node.h"

#include <utility>

#include "mi/log.h"
#include "mi/node_types.h"
#include "mi/property_table.h"
#include "network/network_builder.h"
#include "network/teaming_queries.h"

namespace IC {

namespace {

Error readMembers(const NetworkTeamingNode& node, PropertyValue& out) {
    std::vector<std::string> members;
    if (getBondingMembers(node.name(), members)) {
        out = PropertyValue(members, true);
    }
    return {};
}

Error readName(const NetworkTeamingNode& node, PropertyValue& out) {
    out = PropertyValue(node.name(), true);
    return {};
}

Error readMode(const NetworkTeamingNode& node, PropertyValue& out) {
    std::string mode;
    if (getBondingMode(node.name(), mode)) {
        out = PropertyValue(mode, true);
    }
    return {};
}

constexpr Property<NetworkTeamingNode> kProperties[] = {
    {NetworkTeamingNode::teamMembers, "team members", readMembers},
    {NetworkTeamingNode::teamName, "team name", readName},
    {NetworkTeamingNode::bondingMode, "bonding mode", readMode},
};
static_assert(idsAscend(kProperties));

/// Stores what is known of the team now.
void storeSnapshot(NetworkTeamingNode& node) {
    for (const unsigned int id :
         {NetworkTeamingNode::teamName, NetworkTeamingNode::bondingMode, NetworkTeamingNode::teamMembers}) {
        PropertyValue value;
        findProperty(kProperties, id)->read(node, value);
        if (!value.empty()) {
            node.setProperty(id, value);
        }
    }
}

}  // namespace

NetworkTeamingNode::NetworkTeamingNode(unsigned int nodeId, unsigned int linkedId,
                                       std::vector<unsigned int> miIds, unsigned int nodeType,
                                       unsigned int index, std::string name)
    : MutableNode(nodeId, linkedId, std::move(miIds), nodeType, index), name_(std::move(name)) {
    const LogScope scope("NetworkTeamingNode::NetworkTeamingNode");
}

NetworkTeamingNode::~NetworkTeamingNode() {
    const LogScope scope("NetworkTeamingNode::~NetworkTeamingNode");
}

Error NetworkTeamingNode::getProperty(unsigned int id, PropertyValue& value) const {
    const LogScope scope("NetworkTeamingNode::getProperty");
    const auto* property = findProperty(kProperties, id);
    property != nullptr ? property->read(*this, value) : MutableNode::getProperty(id, value);
    return {};
}

Error NetworkTeamingNode::setProperty(unsigned int const& id, PropertyValue const& value) {
    const LogScope scope("NetworkTeamingNode::setProperty");
    return MutableNode::setProperty(id, value);
}

void NetworkBuilder::createNetworkTeamingNodes() {
    const LogScope scope;
    std::vector<std::string> teams;
    getNICTeams(teams);
    unsigned int index = 0;
    for (const std::string& team : teams) {
        ++index;
        try {
            auto* node =
                tree_.makeNode<NetworkTeamingNode>(tree_.fixed.computer, NodeType::networkTeam, index, team);
            tree_.appendNode(node);
            storeSnapshot(*node);
        } catch (const std::exception&) {
            log(kError) << "NetworkTeaming node error";
        }
    }
}

}  // namespace IC
