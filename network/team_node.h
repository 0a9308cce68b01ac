#pragma once

#include <string>
#include <vector>

#include "framework/ic/mutable_node.h"

namespace IC {

/// A team: a bonding interface with its member ports. It cannot be changed from the agent.
class NetworkTeamingNode : public MutableNode {
public:
    enum PropertyId : unsigned int {
        teamMembers = 165,  ///< list of texts; unset while the team has none
        teamName = 197,     ///< text: the bonding interface
        bondingMode = 198,  ///< text: the driver's words
    };

    NetworkTeamingNode(unsigned int nodeId, unsigned int linkedId, std::vector<unsigned int> miIds,
                       unsigned int nodeType, unsigned int index, std::string name);
    ~NetworkTeamingNode() override;

    const std::string& name() const { return name_; }
    /// Always succeeds; what the host or the store does not know leaves `value` as it was.
    Error getProperty(unsigned int id, PropertyValue& value) const override;
    Error setProperty(unsigned int const& id, PropertyValue const& value) override;

private:
    const std::string name_;
};

}  // namespace IC
