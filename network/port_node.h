#pragma once

#include <string>
#include <vector>

#include "framework/ic/mutable_node.h"

namespace IC {

/// A network port: a physical one, a VLAN or a VMware NIC. Nothing on the host is changed through it.
class NetworkPortNode : public MutableNode {
public:
    enum PropertyId : unsigned int {
        portNames = 0,              ///< list of one text: the interface
        connectorSpeed = 38,        ///< number: Mb/s of the first supported link mode, 0 when it tells none
        speed = 57,                 ///< number, 64 bits: kb/s; 0 for no link or an unknown speed
        autoNegotiation = 67,       ///< boolean
        fullDuplex = 82,            ///< boolean
        interfaceName = 108,        ///< text
        enabledState = 110,         ///< enumeration: always 1
        requestedState = 111,       ///< enumeration: always 1
        interfaceLabel = 121,       ///< text: the name again
        linkState = 123,            ///< number: 1 up, 12 down
        linkStatesSupported = 125,  ///< list of numbers: 0, 1, 12
        wakeOnLanSupported = 182,   ///< list of numbers: 3 (magic packet); unset when ethtool tells nothing
        wakeOnLanEnabled = 183,     ///< list of numbers: 3 (magic packet); unset when ethtool tells nothing
        portType = 185,             ///< number: code of the first supported link mode (getPortType)
        isTeamMember = 193,         ///< boolean: SLAVE of the interface file is yes
        isActiveMember = 194,       ///< boolean: the team sends through this port (or, of eth1, eth10)
        memberLinkStatus = 195,     ///< text: the MII status word, from the team's status file
        memberLinkFailures = 196,   ///< number: link failure count, from the team's status file
        team = 199,                 ///< text: MASTER of the interface file
    };

    /// @param name the interface's
    NetworkPortNode(unsigned int nodeId, unsigned int linkedId, std::vector<unsigned int> miIds,
                    unsigned int nodeType, unsigned int index, std::string name);
    ~NetworkPortNode() override;

    const std::string& name() const { return name_; }
    /// Link facts and the port's place in a team are asked of the host at each call, other ids of the store.
    Error getProperty(unsigned int id, PropertyValue& value) const override;
    /// Stores the value.
    Error setProperty(const unsigned int& id, const PropertyValue& value) override;

    /// Asks the host for everything a port shows and stores it.
    void fill();

private:
    void fillLink();
    void fillCapabilities();
    void fillTeam();

    const std::string name_;
};

}  // namespace IC
