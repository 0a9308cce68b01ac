#include "network/port_queries.h"

#include "mi/command.h"
#include "mi/log.h"
#include "mi/text.h"

namespace IC {

std::string parse::linkMode(const std::string& line) {
    const std::string mode = trimEnd(line);
    return mode.substr(0, mode.find('/'));
}

unsigned int parse::baseTSpeed(const std::string& mode) {
    std::string rest;
    const auto number = static_cast<unsigned int>(leadingDecimal(mode, &rest));
    return rest.starts_with("baseT") ? number : 0;
}

std::string getSupportedLinkMode(const std::string& name) {
    const LogScope scope;
    const FirstLine answer = firstLine(formatCommand(
        "ethtool %s 2> /dev/null | grep \"Supported link modes\" | tr -s ' ' | cut -d ' ' -f4", name));
    return parse::linkMode(answer.line.value_or(""));
}

WakeOnLan getWakeOnLan(const std::string& name) {
    const LogScope scope;
    HostCommand command(formatCommand("ethtool %s 2> /dev/null | grep \"Wake-on\"", name));
    WakeOnLan found;
    while (const auto line = command.nextLine()) {
        (contains(*line, "Supports Wake-on") ? found.supported : found.enabled) = true;
    }
    return found;
}

}  // namespace IC
