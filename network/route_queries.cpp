#include "network/route_queries.h"

#include "mi/command.h"
#include "mi/log.h"
#include "mi/text.h"
#include "network/address_parse.h"

namespace IC {

namespace {

constexpr char kOnLink[] = "0.0.0.0";  ///< what `route -n` prints for a route without a gateway

bool firstLineInto(const Command& command, std::string& text) {
    const FirstLine answer = firstLine(command);
    if (answer.line) {
        text = trimEnd(*answer.line);
    }
    return answer.line.has_value();
}

}  // namespace

bool getIPV4Gateway(const std::string& name, std::string& gateway) {
    const LogScope scope;
    gateway.clear();
    {
        HostCommand routes(formatCommand("route -n | grep %s | tr -s ' ' 2> /dev/null", name));
        if (!routes.started()) {
            return false;
        }
        while (const auto line = routes.nextLine()) {
            log(kProgress) << "Buff :" << *line;
            const auto field = parse::gatewayField(*line);
            gateway = field.value_or(gateway);
            if (field && gateway != kOnLink) {
                return true;
            }
        }
    }
    log(kProgress) << "gw :" << gateway;
    if (gateway != kOnLink) {
        return false;
    }
    return firstLineInto(
        formatCommand("route -n | grep \"^0.0.0.0\" | tr -s ' ' | cut -d ' ' -f2 2> /dev/null"), gateway);
}

bool getIPV6Gateway(const std::string& name, std::string& gateway) {
    const LogScope scope;
    gateway.clear();
    return firstLineInto(formatCommand("route -A inet6 -n 2> /dev/null | grep %s | grep UG | tr -s ' '"
                                       " | cut -d ' ' -f2 2> /dev/null",
                                       name),
                         gateway);
}

bool getStaticIPV6GatewaysOnSuSe10(std::string const& ifName, std::vector<std::string>& gateways) {
    const LogScope scope;
    HostCommand routes(
        formatCommand("route -A inet6 -n 2> /dev/null | grep %s | grep UG | grep -v UGDA"
                      " | tr -s ' ' | cut -d ' ' -f2 2> /dev/null",
                      ifName));
    bool any = false;
    while (const auto line = routes.nextLine()) {
        gateways.push_back(trimEnd(*line));
        any = true;
    }
    return any;
}

bool isIPv6GatewayAddressPresent(const std::string& address) {
    const LogScope scope;
    return contains(address, ":");
}

}  // namespace IC
