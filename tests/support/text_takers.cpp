#include "tests/support/text_takers.h"

#include <algorithm>
#include <string_view>

#include "mi/host_name.h"
#include "network/address_queries.h"
#include "network/dhcp_queries.h"
#include "network/interface_file.h"
#include "network/interface_lists.h"
#include "network/ip_config_node.h"
#include "network/ip_facts.h"
#include "network/ipv4_writer.h"
#include "network/ipv6_writer.h"
#include "network/link_queries.h"
#include "network/port_queries.h"
#include "network/port_walk.h"
#include "network/route_queries.h"
#include "network/saved_settings.h"
#include "network/teaming_queries.h"
#include "tests/support/plugin_access.h"

namespace {

using Text = const std::string&;

std::string scratch;
std::vector<std::string> scratches;
unsigned int number = 0;

void teaming(Text port, unsigned int id, std::string master) {
    IC::getNICTeamingInformation(port, id, scratch, master);
}

void readLinkState(Text name) {
    const IC::IPConfigNode node(1, 1, {1}, 1, 1, name);
    IC::PropertyValue value;
    static_cast<void>(node.getProperty(123, value));
}

/// The nodes of an earlier text go first.
void buildStorage(void (IC::OsHwMI::*build)(bool)) {
    static const bool planted = (IC::OsHwMITestAccess::plantDiskController(1), true);
    static_cast<void>(planted);
    (IC::myoshwmi.*build)(true);
}

constexpr const char* kAroundAMaster = " \t'\"";

const std::vector<TextTaker> kTakers = {
    {"getNetworkSpeed",
     [](Text text) {
         unsigned long long speed = 0;
         IC::getNetworkSpeed(text, speed);
     }},
    {"getNetworkDuplex", [](Text text) { IC::getNetworkDuplex(text); }},
    {"getAutoSense", [](Text text) { IC::getAutoSense(text); }},
    {"getHardwareAddress", [](Text text) { IC::getHardwareAddress(text, scratch); }},
    {"isInterfaceUP", [](Text text) { IC::isInterfaceUP(text); }},
    {"isNICUp", [](Text text) { IC::isNICUp(text); }},
    {"isNICUp, a member", [](Text) { IC::isNICUp("bond9"); }, false, "grep \"Slave Interface:\"", " "},
    {"getSlaveInterfaces", [](Text text) { IC::getSlaveInterfaces(text, scratches); }},
    {"getIPv4Details", [](Text text) { IC::getIPv4Details(text, scratch, scratch); }},
    {"getAddressDetails", [](Text text) { IC::getAddressDetails(text, scratch, number); }},
    {"getIPv6Address", [](Text text) { IC::getIPv6Address(text, scratch, number); }},
    {"getIPv6Address, an address", [](Text) { IC::getIPv6Address("p0", scratch, number); }, false, "ip -6 "},
    {"getProtocolIIFType", [](Text text) { IC::getProtocolIIFType(text, number); }},
    {"getIPv6AddressType", [](Text text) { IC::getIPv6AddressType(text, number); }},
    {"hasIPConfig", [](Text text) { IC::PortWalk::hasIPConfig(text); }},
    {"getSupportedLinkMode", [](Text text) { IC::getSupportedLinkMode(text); }},
    {"getWakeOnLan", [](Text text) { IC::getWakeOnLan(text); }},
    {"interfaceFileValue", [](Text text) { IC::interfaceFileValue(text, "STARTMODE"); }},
    {"getBootProto", [](Text text) { IC::getBootProto(text, scratch); }},
    {"checkIsDhcp", [](Text text) { IC::checkIsDhcp(text); }},
    {"dhcpServersOf", [](Text text) { IC::dhcpServersOf(text); }},
    {"ipv6InterfaceIdOf", [](Text text) { IC::ipv6InterfaceIdOf(text); }},
    {"preferredIPv6Gateway", [](Text text) { IC::preferredIPv6Gateway(text); }},
    {"getIPV4Gateway", [](Text text) { IC::getIPV4Gateway(text, scratch); }},
    {"getIPV6Gateway", [](Text text) { IC::getIPV6Gateway(text, scratch); }},
    {"getBondingMode", [](Text text) { IC::getBondingMode(text, scratch); }},
    {"getBondingMembers", [](Text text) { IC::getBondingMembers(text, scratches); }},
    {"role", [](Text text) { teaming(text, IC::TeamingProperty::role, ""); }},
    {"miiStatus", [](Text text) { teaming(text, IC::TeamingProperty::miiStatus, "p0"); }},
    {"miiStatus, the master", [](Text text) { teaming("p0", IC::TeamingProperty::miiStatus, text); }, false,
     nullptr, "", kAroundAMaster},
    {"linkFailures", [](Text text) { teaming(text, IC::TeamingProperty::linkFailures, "p0"); }},
    {"linkFailures, the master", [](Text text) { teaming("p0", IC::TeamingProperty::linkFailures, text); },
     false, nullptr, "", kAroundAMaster},
    {"linkFailures, the status", [](Text) { teaming("p0", IC::TeamingProperty::linkFailures, "p1"); }, false,
     "grep \"MII Status: \""},
    {"activeMember", [](Text text) { teaming(text, IC::TeamingProperty::activeMember, "."); }},
    {"link state", readLinkState},
    {"bondedNetNodeStatus", [](Text text) { IC::myoshwmi.bondedNetNodeStatus(text); }},
    {"createHardDriveNodes", [](Text) { buildStorage(&IC::OsHwMI::createHardDriveNodes); }, false,
     "cat /tmp/fdisk_tmp"},
    {"createPartitionNodes", [](Text) { buildStorage(&IC::OsHwMI::createPartitionNodes); }, false,
     "cat /tmp/fdisk_tmp"},
    {"deleteSavedConfigurations", [](Text) { IC::deleteSavedConfigurations(); }, true, "ls ",
     "/opt/vantrel/corvista/data/ifcfg-", "", "/"},
    {"getStaticIPV6GatewaysOnSuSe10", [](Text text) { IC::getStaticIPV6GatewaysOnSuSe10(text, scratches); }},
    {"deleteStaticIPv6GatewayOnSuSe10",
     [](Text text) { IC::deleteStaticIPv6GatewayOnSuSe10(text, {"::1"}); }},
    {"deleteStaticIPv6GatewayOnSuSe10, the gateway",
     [](Text text) { IC::deleteStaticIPv6GatewayOnSuSe10("p0", {text}); }},
    {"setIPv6GatewayForSuSe10", [](Text text) { IC::setIPv6GatewayForSuSe10(text, "::1"); }, true},
    {"setIPv6GatewayForSuSe10, the gateway", [](Text text) { IC::setIPv6GatewayForSuSe10("p0", text); },
     true},
    {"setSubnetMask", [](Text text) { IC::setSubnetMask(text, "255.0.0.0", "00:11"); }, true},
    {"setSubnetMask, the mask", [](Text text) { IC::setSubnetMask("p0", text, "00:11"); }, true},
    {"setIPV4Gateway", [](Text text) { IC::setIPV4Gateway(text, "10.0.0.2", "10.0.0.1"); }, true},
    {"setIPV4Gateway, the address", [](Text text) { IC::setIPV4Gateway("p0", text, "10.0.0.1"); }, true},
    {"setIPV4Gateway, the gateway", [](Text text) { IC::setIPV4Gateway("p0", "10.0.0.2", text); }, true},
    {"setInterfaceStatus, up", [](Text text) { IC::setInterfaceStatus(text, 1); }},
    {"setInterfaceStatus, down", [](Text text) { IC::setInterfaceStatus(text, 12); }},
    {"the host name", [](Text text) { IC::executeDomainandHostnameChanges(text, "", false, ""); }, true},
    {"the host name before a domain",
     [](Text text) { IC::executeDomainandHostnameChanges(text, "org", false, ""); }, true},
    {"the domain name", [](Text text) { IC::executeDomainandHostnameChanges("p0", text, true, ""); }, true},
};

/// What lets a function come to its last command.
struct Answer {
    std::string_view taker;
    const char* part;
    const char* output;
};
constexpr Answer kAnswers[] = {
    {"isNICUp", "grep \"MII Status:\"", "MII Status: up\n"},
    {"createHardDriveNodes", "-f2", "/dev/sda:\n"},
    {"getIPv4Details", "-f1 2>", "192.0.2.1\n"},
    {"getIPv6AddressType", "ip -6 ", "    inet6 2001:db8::1/64 scope global\n"},
    {"getIPv6AddressType", "-f3 2>", "2001:db8::1/64\n"},
};

}  // namespace

std::string TextTaker::entering(const std::string& text) const {
    const auto first = std::min(text.find_first_not_of(loses), text.size());
    return printedBefore + text.substr(first, text.find_last_not_of(loses) + 1 - first);
}

std::string TextTaker::answer(const std::string& command, const std::string& text) const {
    if (printedBy != nullptr && command.find(printedBy) != command.npos) {
        return entering(text) + '\n';
    }
    for (const Answer& known : kAnswers) {
        if (std::string_view(name).starts_with(known.taker) && command.find(known.part) != command.npos) {
            return known.output;
        }
    }
    return "";
}

const std::vector<TextTaker>& textTakers() {
    return kTakers;
}
