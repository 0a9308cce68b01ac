#pragma once

#include <map>
#include <string>
#include <vector>

#include "framework/ic/mutable_node.h"
#include "framework/netinfo/records.h"

namespace IC {

/// The LAN endpoint of an interface, as NetworkBuilder::createLANEndPointNodes builds it. Nothing in the
/// plug-in calls that builder.
class CLANEndPointNode : public MutableNode {
public:
    enum PropertyId : unsigned int {
        interfaceName = 108,  ///< text
    };

    /// @param name the interface's
    CLANEndPointNode(unsigned int nodeId, unsigned int linkedId, std::vector<unsigned int> miIds,
                     unsigned int nodeType, unsigned int index, std::string name);
    ~CLANEndPointNode() override;

    const std::string& name() const { return name_; }
    Error getProperty(unsigned int id, PropertyValue& value) const override;
    Error setProperty(const unsigned int& id, const PropertyValue& value) override;

private:
    const std::string name_;
};

/// Port records by interface name, for looking up the parents of LAN endpoints; null while nobody keeps any.
extern std::map<std::string, CEthernetPort*>* m_mapEthernetPorts;

/// The node of the port that an interface's name is derived from: eth0 of "eth0#1".
/// @param id receives the port's node id; untouched when no port record has that name
/// @return whether there is one
bool getParentLANEndPointNode(std::string name, unsigned int& id);

}  // namespace IC
