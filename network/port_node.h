#pragma once

#include "mi/host_node.h"

namespace IC {

extern const NodeClass networkPortClass;

/// A network port: a physical one, a VLAN or a VMware NIC. Link facts and its place in a team are asked of
/// the host at each read; nothing on the host is changed through it. Its name is the interface's.
class NetworkPortNode : public NodeOf<networkPortClass> {
public:
    using NodeOf::NodeOf;

    /// Asks the host for everything a port shows and stores it.
    void fill();
};

}  // namespace IC
