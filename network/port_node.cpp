#include "network/port_node.h"

#include "framework/ic/link_state.h"
#include "mi/text.h"
#include "network/link_queries.h"
#include "network/port_queries.h"
#include "network/port_type.h"
#include "network/teaming_queries.h"

namespace IC {

namespace {

namespace PortId {
enum : unsigned int {
    portNames = 0,              ///< list of one text: the interface
    connectorSpeed = 38,        ///< number: Mb/s of the first supported link mode, 0 when it tells none
    speed = 57,                 ///< number, 64 bits: kb/s; 0 for no link or an unknown speed
    autoNegotiation = 67,       ///< boolean
    fullDuplex = 82,            ///< boolean
    interfaceName = 108,        ///< text
    enabledState = 110,         ///< enumeration: always 1
    requestedState = 111,       ///< enumeration: always 1
    interfaceLabel = 121,       ///< text: the name again
    linkState = 123,            ///< number: LinkState::up or down
    linkStatesSupported = 125,  ///< list of numbers: 0, up, down
    wakeOnLanSupported = 182,   ///< list of numbers: 3 (magic packet); unset when ethtool tells nothing
    wakeOnLanEnabled = 183,     ///< list of numbers: 3 (magic packet); unset when ethtool tells nothing
    portType = 185,             ///< number: code of the first supported link mode (getPortType)
    isTeamMember = 193,         ///< boolean: SLAVE of the interface file is yes
    isActiveMember = 194,       ///< boolean: the team sends through this port (or, of eth1, eth10)
    memberLinkStatus = 195,     ///< text: the MII status word, from the team's status file
    memberLinkFailures = 196,   ///< number: link failure count, from the team's status file
    team = 199,                 ///< text: MASTER of the interface file
};
}  // namespace PortId

PropertyValue speedOf(const std::string& name) {
    unsigned long long speed = 0;
    getNetworkSpeed(name, speed);
    return {Number(speed), true};
}

PropertyValue autoNegotiationOf(const std::string& name) {
    return {Number(getAutoSense(name)), true};
}

PropertyValue duplexOf(const std::string& name) {
    return {Number(getNetworkDuplex(name)), true};
}

PropertyValue portStateOf(const std::string& name) {
    return {Number(isNICUp(name) ? LinkState::up : LinkState::down), true};
}

/// What the interface file says of the port's place in a team.
struct TeamRole {
    bool isMember;
    std::string team;
};

TeamRole roleOf(const std::string& name) {
    std::string slave;
    std::string master;
    getNICTeamingInformation(name, TeamingProperty::role, slave, master);
    return {slave == "yes", master};
}

PropertyValue isTeamMember(const std::string& name) {
    return {Number(roleOf(name).isMember), true};
}

PropertyValue teamOfPort(const std::string& name) {
    return {roleOf(name).team, true};
}

/// What the status file of a port's team says of the port.
PropertyValue memberFact(const std::string& name, unsigned int id, std::string team) {
    std::string fact;
    getNICTeamingInformation(name, id, fact, team);
    switch (id) {
        case PortId::isActiveMember:
            return {Number(!fact.empty()), true};
        case PortId::memberLinkFailures:
            return {Number(static_cast<unsigned int>(leadingDecimal(fact))), true};
        default:
            return {fact, true};
    }
}

template <unsigned int id>
PropertyValue memberFactOf(const std::string& name) {
    return memberFact(name, id, roleOf(name).team);
}

constexpr Property kPortProperties[] = {
    {PortId::speed, speedOf},
    {PortId::autoNegotiation, autoNegotiationOf},
    {PortId::fullDuplex, duplexOf},
    {PortId::linkState, portStateOf},
    {PortId::isTeamMember, isTeamMember},
    {PortId::isActiveMember, memberFactOf<PortId::isActiveMember>},
    {PortId::memberLinkStatus, memberFactOf<PortId::memberLinkStatus>},
    {PortId::memberLinkFailures, memberFactOf<PortId::memberLinkFailures>},
    {PortId::team, teamOfPort},
};
static_assert(idsAscend(kPortProperties));

void fillPortLink(NetworkPortNode& port) {
    const PropertyValue state = portStateOf(port.name());
    port.setStatus(static_cast<unsigned int>(state));
    port.setProperty(PortId::linkState, state);
    port.setProperty(PortId::speed, speedOf(port.name()));
    port.setProperty(PortId::fullDuplex, duplexOf(port.name()));
    port.setProperty(PortId::autoNegotiation, autoNegotiationOf(port.name()));
}

void fillCapabilities(NetworkPortNode& port) {
    const std::string mode = getSupportedLinkMode(port.name());
    port.setProperty(PortId::portType, {Number(getPortType(mode.c_str())), true});
    port.setProperty(PortId::connectorSpeed, {Number(parse::baseTSpeed(mode)), true});
    const WakeOnLan wakeOnLan = getWakeOnLan(port.name());
    const PropertyValue magicPacket(std::vector<Number>{3U}, true);
    if (wakeOnLan.supported) {
        port.setProperty(PortId::wakeOnLanSupported, magicPacket);
    }
    if (wakeOnLan.enabled) {
        port.setProperty(PortId::wakeOnLanEnabled, magicPacket);
    }
}

void fillTeam(NetworkPortNode& port) {
    const TeamRole role = roleOf(port.name());  // asked once for all of them
    port.setProperty(PortId::isTeamMember, {Number(role.isMember), true});
    port.setProperty(PortId::team, {role.team, true});
    for (const unsigned int id :
         {PortId::isActiveMember, PortId::memberLinkStatus, PortId::memberLinkFailures}) {
        port.setProperty(id, memberFact(port.name(), id, role.team));
    }
}

}  // namespace

constinit const NodeClass networkPortClass{"~NetworkPortNode", kPortProperties};

void NetworkPortNode::fill() {
    setProperty(PortId::interfaceName, {name(), true});
    setProperty(PortId::interfaceLabel, {name(), true});
    setProperty(PortId::portNames, {std::vector<std::string>{name()}, true});
    setProperty(PortId::enabledState, {EnumValue(1), true});
    setProperty(PortId::requestedState, {EnumValue(1), true});
    setProperty(PortId::linkStatesSupported, {std::vector<Number>{0U, LinkState::up, LinkState::down}, true});
    fillPortLink(*this);
    fillCapabilities(*this);
    fillTeam(*this);
}

}  // namespace IC
