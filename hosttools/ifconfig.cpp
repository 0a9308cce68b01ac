#include <net/if.h>
#include <cerrno>
#include <cstring>
#include <memory>
#include <optional>
#include <string>

#include "hosttools/applet.h"
#include "hosttools/ifconfig_change.h"
#include "hosttools/ifconfig_listing.h"

namespace hosttools {
namespace {

constexpr const char* toolName = "ifconfig";

int listAll(bool downToo, Host& host, Answer& answer) {
    std::shared_ptr<const Interfaces> interfaces;
    if (const int error = host.interfaces({}, interfaces); error != 0) {
        answer.complain(toolName, Text().add("netlink: ").add(std::strerror(error)));
        return 1;
    }
    for (const Stanza& stanza : listStanzas(*interfaces)) {
        if (downToo || (stanza.link->flags & IFF_UP)) listInterface(answer.out, stanza);
    }
    return 0;
}

int listOne(std::string_view name, Host& host, Answer& answer) {
    std::shared_ptr<const Interfaces> interfaces;
    const std::string_view link = name.substr(0, name.find(':'));
    const int error = link.empty() ? ENODEV : host.interfaces(link, interfaces);
    const auto stanza = error == 0 ? makeStanza(*interfaces, name) : std::nullopt;
    if (!stanza) {
        const char* reason = error == ENODEV || error == 0 ? "Device not found" : std::strerror(error);
        answer.complain(toolName,
                        Text().add(name).add(": error fetching interface information: ").add(reason));
        return 1;
    }
    listInterface(answer.out, *stanza);
    return 0;
}

}  // namespace

int runIfconfig(Arguments arguments, Host& host, Answer& answer) {
    const bool all = !arguments.empty() && std::string_view(arguments.front()) == "-a";
    const Arguments words = all ? arguments.subspan(1) : arguments;
    if (words.empty()) return listAll(all, host, answer);
    if (*words.front() == '-') return answer.leaveToHost(toolName, words.front());
    if (words.size() == 1) return listOne(words.front(), host, answer);
    return changeInterface(words.front(), words.subspan(1), answer);
}

}  // namespace hosttools
