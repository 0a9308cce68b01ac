#include "network/ipv6_writer.h"

#include "mi/command.h"
#include "mi/log.h"
#include "mi/text.h"
#include "network/interface_file.h"
#include "network/route_queries.h"
#include "network/routes_file.h"

namespace IC {

void setIPv6Address(std::string, std::string address, std::string mac) {
    const LogScope scope;
    KeyLine label{"LABEL_", "LABEL_1='1'\n"};
    KeyLine secondary{"IPADDR_", "IPADDR_1=" + address + '\n'};
    KeyLine bootProto{kBootProto, kStaticBootProto, KeyLine::Held::kept};
    InterfaceFile file(mac);
    file.replace({&label, &secondary, &bootProto});
    file.appendMissing({&bootProto, &label, &secondary});
    file.write("Writing IP Address");
}

void setIPv6PrefixLength(std::string, unsigned int prefixLength, std::string mac) {
    const LogScope scope;
    KeyLine length{"PREFIXLEN_", "PREFIXLEN_1=" + signedDecimal(prefixLength) + '\n'};
    InterfaceFile file(mac);
    file.replace({&length});
    file.appendMissing({&length});
    file.write(kInterfaceFileOpened);
}

void setIPv6Gateway(std::string ifName, std::string gateway, std::string) {
    const LogScope scope;
    setIPv6GatewayForSuSe10(ifName, gateway);
}

void setIPv6GatewayForSuSe10(std::string const& ifName, std::string const& gateway) {
    const LogScope scope("setIPv6GatewayForSuSe: entry", "setIPv6GatewayForSuSe10: exit");
    if (ifName.empty() || gateway.empty()) {
        log(kError) << "Either NIC or gateway is null";
        return;
    }
    std::vector<std::string> gateways;
    getStaticIPV6GatewaysOnSuSe10(ifName, gateways);
    const bool isPresent = std::erase(gateways, gateway) > 0;
    if (!isPresent &&
        !HostCommand(formatCommand("ip -6 route add default via %s dev %s 2> /dev/null", gateway, ifName))
             .started()) {
        log(kError) << "Could not execute 'ip -6 route add default' command";
        return;
    }
    deleteStaticIPv6GatewayOnSuSe10(ifName, gateways);
    if (replaceDefaultRoute(AddressFamily::ipv6, gateway) == RoutesRewrite::notWritten) {
        log(kError) << "Can not open '/etc/sysconfig/network/routes' in write mode.";
    }
}

void deleteStaticIPv6GatewayOnSuSe10(std::string const& ifName, std::vector<std::string> const& gateways) {
    const LogScope scope;
    for (const std::string& gateway : gateways) {
        HostCommand::fromText(textCommand("ip -6 route delete default via %s dev %s", gateway, ifName));
    }
}

}  // namespace IC
