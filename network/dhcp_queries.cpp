#include "network/dhcp_queries.h"

#include "mi/command.h"
#include "mi/log.h"
#include "network/address_parse.h"
#include "network/interface_file.h"

namespace IC {

bool checkIsDhcp(const std::string& name) {
    const LogScope scope("NetworkPortNode::checkIsDhcp ");
    return firstLine(formatCommand("cat /var/lib/dhcpcd/dhcpcd-%s.info 2> /dev/null", name)).line.has_value();
}

void getBootProto(const std::string& name, std::string& keyword) {
    const LogScope scope("Entering getBootProto", "Exiting getBootProto");
    keyword.clear();
    if (const auto value = interfaceFileValue(name, "BOOTPROTO")) {
        keyword = parse::unquoted(*value);
    }
}

bool getDHCPv6Servers(const std::string& /*name*/, std::string& server) {
    const LogScope scope;
    const FirstLine answer = firstLine(formatCommand(
        "cat /var/lib/dhcpv6/client6.leases* 2> /dev/null | grep SDUID | cut -d ' ' -f3 2> /dev/null"));
    if (answer.line) {
        server = parse::dhcpv6Server(*answer.line);
    }
    return answer.line.has_value();
}

}  // namespace IC
