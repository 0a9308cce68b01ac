#include "network/port_node.h"

#include <utility>

#include "mi/log.h"
#include "mi/property_table.h"
#include "mi/text.h"
#include "network/link_codes.h"
#include "network/link_queries.h"
#include "network/port_queries.h"
#include "network/port_type.h"
#include "network/teaming_queries.h"

namespace IC {

namespace {

PropertyValue numberOf(bool flag) {
    return {Number(flag), true};
}

unsigned long long speedOf(const std::string& name) {
    unsigned long long speed = 0;
    getNetworkSpeed(name, speed);
    return speed;
}

unsigned int linkStateOf(const std::string& name) {
    return isNICUp(name) ? LinkCode::up : LinkCode::down;
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

/// An answer from the status file of the team the port belongs to.
std::string memberFact(const std::string& name, unsigned int id, std::string team) {
    std::string fact;
    getNICTeamingInformation(name, id, fact, team);
    return fact;
}

PropertyValue isActive(const std::string& fact) {
    return numberOf(!fact.empty());
}

PropertyValue failureCount(const std::string& fact) {
    return {Number(static_cast<unsigned int>(leadingDecimal(fact))), true};
}

using Port = NetworkPortNode;

Error readSpeed(const Port& port, PropertyValue& out) {
    out = {Number(speedOf(port.name())), true};
    return {};
}

Error readAutoNegotiation(const Port& port, PropertyValue& out) {
    out = numberOf(getAutoSense(port.name()));
    return {};
}

Error readDuplex(const Port& port, PropertyValue& out) {
    out = numberOf(getNetworkDuplex(port.name()));
    return {};
}

Error readLinkState(const Port& port, PropertyValue& out) {
    out = {Number(linkStateOf(port.name())), true};
    return {};
}

Error readIsMember(const Port& port, PropertyValue& out) {
    out = numberOf(roleOf(port.name()).isMember);
    return {};
}

Error readIsActive(const Port& port, PropertyValue& out) {
    out = isActive(memberFact(port.name(), TeamingProperty::activeMember, roleOf(port.name()).team));
    return {};
}

Error readLinkStatus(const Port& port, PropertyValue& out) {
    out = {memberFact(port.name(), TeamingProperty::miiStatus, roleOf(port.name()).team), true};
    return {};
}

Error readLinkFailures(const Port& port, PropertyValue& out) {
    out = failureCount(memberFact(port.name(), TeamingProperty::linkFailures, roleOf(port.name()).team));
    return {};
}

Error readTeam(const Port& port, PropertyValue& out) {
    out = {roleOf(port.name()).team, true};
    return {};
}

constexpr Property<Port> kPortProperties[] = {
    {Port::speed, "speed", readSpeed},
    {Port::autoNegotiation, "auto-negotiation", readAutoNegotiation},
    {Port::fullDuplex, "full duplex", readDuplex},
    {Port::linkState, "link state", readLinkState},
    {Port::isTeamMember, "is a team member", readIsMember},
    {Port::isActiveMember, "is the active member", readIsActive},
    {Port::memberLinkStatus, "member link status", readLinkStatus},
    {Port::memberLinkFailures, "member link failures", readLinkFailures},
    {Port::team, "team", readTeam},
};
static_assert(idsAscend(kPortProperties));

}  // namespace

NetworkPortNode::NetworkPortNode(unsigned int nodeId, unsigned int linkedId, std::vector<unsigned int> miIds,
                                 unsigned int nodeType, unsigned int index, std::string name)
    : MutableNode(nodeId, linkedId, std::move(miIds), nodeType, index), name_(std::move(name)) {
    const LogScope scope("NetworkPortNode::NetworkPortNode");
}

NetworkPortNode::~NetworkPortNode() {
    const LogScope scope("NetworkPortNode::~NetworkPortNode");
}

Error NetworkPortNode::getProperty(unsigned int id, PropertyValue& value) const {
    const LogScope scope("NetworkPortNode::getProperty");
    const auto* live = findProperty(kPortProperties, id);
    return live != nullptr ? live->read(*this, value) : MutableNode::getProperty(id, value);
}

Error NetworkPortNode::setProperty(const unsigned int& id, const PropertyValue& value) {
    const LogScope scope("NetworkPortNode::setProperty");
    return MutableNode::setProperty(id, value);
}

void NetworkPortNode::fill() {
    setProperty(interfaceName, {name_, true});
    setProperty(interfaceLabel, {name_, true});
    setProperty(portNames, {std::vector<std::string>{name_}, true});
    setProperty(enabledState, {EnumValue(1), true});
    setProperty(requestedState, {EnumValue(1), true});
    setProperty(linkStatesSupported, {std::vector<Number>{0U, LinkCode::up, LinkCode::down}, true});
    fillLink();
    fillCapabilities();
    fillTeam();
}

void NetworkPortNode::fillLink() {
    const unsigned int state = linkStateOf(name_);
    setStatus(state);
    setProperty(linkState, {Number(state), true});
    setProperty(speed, {Number(speedOf(name_)), true});
    setProperty(fullDuplex, numberOf(getNetworkDuplex(name_)));
    setProperty(autoNegotiation, numberOf(getAutoSense(name_)));
}

void NetworkPortNode::fillCapabilities() {
    const std::string mode = getSupportedLinkMode(name_);
    setProperty(portType, {Number(getPortType(mode.c_str())), true});
    setProperty(connectorSpeed, {Number(parse::baseTSpeed(mode)), true});
    const WakeOnLan wakeOnLan = getWakeOnLan(name_);
    const PropertyValue magicPacket(std::vector<Number>{3U}, true);
    if (wakeOnLan.supported) {
        setProperty(wakeOnLanSupported, magicPacket);
    }
    if (wakeOnLan.enabled) {
        setProperty(wakeOnLanEnabled, magicPacket);
    }
}

void NetworkPortNode::fillTeam() {
    const TeamRole role = roleOf(name_);
    setProperty(isTeamMember, numberOf(role.isMember));
    setProperty(team, {role.team, true});
    setProperty(isActiveMember, isActive(memberFact(name_, TeamingProperty::activeMember, role.team)));
    setProperty(memberLinkStatus, {memberFact(name_, TeamingProperty::miiStatus, role.team), true});
    setProperty(memberLinkFailures,
                failureCount(memberFact(name_, TeamingProperty::linkFailures, role.team)));
}

}  // namespace IC
