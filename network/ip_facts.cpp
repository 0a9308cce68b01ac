#include "network/ip_facts.h"

#include "mi/command.h"
#include "mi/text.h"
#include "network/address_parse.h"
#include "network/address_queries.h"
#include "network/dhcp_queries.h"
#include "network/route_queries.h"

namespace IC {

IPv4 ipv4Of(const std::string& name) {
    IPv4 ip;
    ip.isWhole = getIPv4Details(name, ip.address, ip.mask);
    return ip;
}

IPv6 ipv6Of(const std::string& name) {
    IPv6 ip;
    getIPv6Address(name, ip.address, ip.prefixLength);
    return ip;
}

std::string bootProtoOf(const std::string& name) {
    std::string keyword;
    getBootProto(name, keyword);
    return keyword;
}

bool isBondListed(const std::string& bond) {
    return firstLine(HostCommand::fromText(textCommand("ifconfig | grep %s 2> /dev/null", bond)))
        .line.has_value();
}

std::string preferredIPv6Gateway(const std::string& name) {
    std::vector<std::string> gateways;
    if (getStaticIPV6GatewaysOnSuSe10(name, gateways)) {
        return gateways.front();
    }
    std::string gateway;
    getIPV6Gateway(name, gateway);
    return gateway;
}

std::vector<std::string> dhcpServersOf(const std::string& name) {
    std::vector<std::string> servers;
    const FirstLine lease = firstLine(formatCommand(
        "cat /var/lib/dhcpcd/dhcpcd-%s.info 2> /dev/null | grep DHCPSID | cut -d '=' -f2 2> /dev/null",
        name));
    if (lease.line) {
        servers.push_back(parse::unquoted(*lease.line));
    }
    if (std::string server; getDHCPv6Servers(name, server)) {
        servers.push_back(server);
    }
    return servers;
}

std::string ipv6InterfaceIdOf(const std::string& address) {
    const FirstLine group = firstLine(formatCommand("echo %s | cut -d: -f4 2> /dev/null", address));
    const std::string text = trimEnd(group.line.value_or(""));
    return text.substr(0, text.find(' '));
}

}  // namespace IC
