// Network ports, LAN endpoints and teams.
#include "agent/core/oshw/tables.h"
#include "framework/ic/link_state.h"

namespace cvagent::oshw {

namespace {

constexpr Label kLinkStates[] = {{"up", IC::LinkState::up},
                                 {"down", IC::LinkState::down},
                                 {"switched over", IC::LinkState::switchedOver},
                                 {"switched back", IC::LinkState::switchedBack}};
constexpr Label kPortTypes[] = {
    {"unknown", 0},       {"other", 1},        {"10BaseT", 50},
    {"10-100BaseT", 51},  {"100BaseT", 52},    {"1000BaseT", 53},
    {"2500BaseT", 54},    {"10GBaseT", 55},    {"10GBase-CX4", 56},
    {"100Base-FX", 100},  {"100Base-SX", 101}, {"1000Base-LX", 103},
    {"1000Base-CX", 104}, {"10GBase-SR", 105}, {"10GBase-SW", 106},
    {"10GBase-LX4", 107}, {"10GBase-LR", 108}, {"10GBase-LW", 109},
    {"10GBase-ER", 110},  {"10GBase-EW", 111}, {"vendor reserved", 16000},
};
constexpr Label kSpeeds[] = {{"not known", 0}};  // what the plug-in answers when the host tells no speed
constexpr Label kWake[] = {{"magic packet", 3}};

constexpr auto port = NodeType::networkPort;

constexpr Property kPortRows[] = {
    {port, 0, "PortNames", Kind::texts, Unit::none, {}, "the interface name, as a list of one"},
    {port, 38, "SupportedSpeed", Kind::number, Unit::megabitsPerSecond, kSpeeds,
     "speed of the first link mode that the port supports"},
    {port, 57, "LinkSpeed", Kind::number, Unit::kilobitsPerSecond, kSpeeds,
     "speed of the link; 0 when the host tells none"},
    {port,
     67,
     "AutoNegotiation",
     Kind::number,
     Unit::none,
     {},
     "whether the port can negotiate speed and duplex; not whether it does"},
    {port, 82, "FullDuplex", Kind::number, Unit::none, {}, "whether the link is full duplex"},
    {port, 108, "InterfaceName", Kind::text, Unit::none, {}, "the interface name"},
    {port, 110, "PortConstant110", Kind::enumeration, Unit::none, {}, "always 1"},
    {port, 111, "PortConstant111", Kind::enumeration, Unit::none, {}, "always 1"},
    {port, 121, "DisplayName", Kind::text, Unit::none, {}, "the interface name once more"},
    {port, 123, "LinkState", Kind::number, Unit::none, kLinkStates, "whether the port has a link"},
    {port, 125, "LinkStates", Kind::numbers, Unit::none, kLinkStates, "the states a port can have"},
    {port, 182, "WakeOnLanSupported", Kind::numbers, Unit::none, kWake,
     "3 (magic packet) when ethtool prints a Supports Wake-on line, whatever it says"},
    {port, 183, "WakeOnLanEnabled", Kind::numbers, Unit::none, kWake,
     "3 (magic packet) when ethtool prints a Wake-on line, whatever it says"},
    {port, 185, "PortType", Kind::number, Unit::none, kPortTypes, "kind of the first link mode supported"},
    {port, 193, "IsTeamMember", Kind::number, Unit::none, {}, "whether the port belongs to a team"},
    {port, 194, "IsActiveMember", Kind::number, Unit::none, {}, "whether it carries the team's traffic now"},
    {port, 195, "MemberLinkStatus", Kind::text, Unit::none, {}, "the team's word for the member's link"},
    {port, 196, "MemberLinkFailures", Kind::number, Unit::none, {}, "how often the member's link has failed"},
    {port, 199, "TeamName", Kind::text, Unit::none, {}, "the team the port belongs to; empty for none"},
    {NodeType::lanEndpoint, 108, "InterfaceName", Kind::text, Unit::none, {}, "the interface name"},
    {NodeType::team, 165, "MemberPorts", Kind::texts, Unit::none, {}, "the ports that form the team"},
    {NodeType::team, 197, "TeamName", Kind::text, Unit::none, {}, "the team's interface name"},
    {NodeType::team, 198, "TeamMode", Kind::text, Unit::none, {}, "how the team uses its members"},
};

}  // namespace

std::span<const Property> networkPortProperties() {
    return kPortRows;
}

}  // namespace cvagent::oshw
