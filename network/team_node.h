#pragma once

#include "mi/host_node.h"

namespace IC {

extern const NodeClass networkTeamingClass;

/// A team: a bonding interface with its member ports. It cannot be changed from the agent. Its name is the
/// bonding interface's.
class NetworkTeamingNode : public NodeOf<networkTeamingClass> {
public:
    using NodeOf::NodeOf;

    /// Always succeeds; what the host or the store does not know leaves `out` as it was.
    Error getProperty(unsigned int id, PropertyValue& out) const override;
};

}  // namespace IC
