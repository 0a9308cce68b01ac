#pragma once

#include <map>
#include <string>

#include "framework/netinfo/records.h"
#include "mi/host_node.h"

namespace IC {

extern const NodeClass lanEndPointClass;

/// The LAN endpoint of an interface, as NetworkBuilder::createLANEndPointNodes builds it; nothing in the
/// plug-in calls that builder. Its name is the interface's.
class CLANEndPointNode : public NodeOf<lanEndPointClass> {
public:
    using NodeOf::NodeOf;
};

/// Port records by interface name, for looking up the parents of LAN endpoints; null while nobody keeps any.
extern std::map<std::string, CEthernetPort*>* m_mapEthernetPorts;

/// The node of the port that an interface's name is derived from: eth0 of "eth0#1".
/// @param id receives the port's node id; untouched when no port record has that name
/// @return whether there is one
bool getParentLANEndPointNode(std::string name, unsigned int& id);

}  // namespace IC
