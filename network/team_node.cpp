#include "network/team_node.h"

#include "mi/node_types.h"
#include "network/network_builder.h"
#include "network/teaming_queries.h"

namespace IC {

namespace {

namespace TeamId {
enum : unsigned int {
    members = 165,      ///< list of texts; unset while the team has none
    name = 197,         ///< text: the bonding interface
    bondingMode = 198,  ///< text: the driver's words
};
}  // namespace TeamId

PropertyValue membersOfTeam(const std::string& team) {
    std::vector<std::string> members;
    return getBondingMembers(team, members) ? PropertyValue(members, true) : PropertyValue();
}

PropertyValue nameOfTeam(const std::string& team) {
    return {team, true};
}

PropertyValue modeOfTeam(const std::string& team) {
    std::string mode;
    return getBondingMode(team, mode) ? PropertyValue(mode, true) : PropertyValue();
}

constexpr Property kTeamProperties[] = {
    {TeamId::members, membersOfTeam},
    {TeamId::name, nameOfTeam},
    {TeamId::bondingMode, modeOfTeam},
};
static_assert(idsAscend(kTeamProperties));

/// Stores what is known of the team now.
void storeSnapshot(NetworkTeamingNode& node) {
    for (const unsigned int id : {TeamId::name, TeamId::bondingMode, TeamId::members}) {
        const PropertyValue value = networkTeamingClass.find(id)->read(node.name());
        if (!value.empty()) {
            node.setProperty(id, value);
        }
    }
}

}  // namespace

constinit const NodeClass networkTeamingClass{"~NetworkTeamingNode", kTeamProperties};

Error NetworkTeamingNode::getProperty(unsigned int id, PropertyValue& out) const {
    HostNode::getProperty(id, out);
    return {};
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
