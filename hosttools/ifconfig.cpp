#include <net/if.h>
#include <cerrno>
#include <cstring>
#include <string>

#include "hosttools/applet.h"
#include "hosttools/ifconfig_change.h"
#include "hosttools/ifconfig_listing.h"

namespace hosttools {
namespace {

constexpr const char* toolName = "ifconfig";

int listAll(bool downToo) {
    Interfaces interfaces;
    if (const int error = readInterfaces({}, interfaces); error != 0) {
        complain(toolName, Text().add("netlink: ").add(std::strerror(error)));
        return 1;
    }
    Text text;
    for (const Stanza& stanza : listStanzas(interfaces)) {
        if (downToo || (stanza.link->flags & IFF_UP)) listInterface(text, stanza);
    }
    return finish(text);
}

int listOne(std::string_view name) {
    Interfaces interfaces;
    const int error = readInterfaces(name.substr(0, name.find(':')), interfaces);
    if (error != 0 || interfaces.links.empty()) {
        const char* reason = error == ENODEV || error == 0 ? "Device not found" : std::strerror(error);
        complain(toolName, Text().add(name).add(": error fetching interface information: ").add(reason));
        return 1;
    }
    Text text;
    listInterface(text, makeStanza(interfaces, name));
    return finish(text);
}

}  // namespace

int runIfconfig(Arguments arguments) {
    const bool all = !arguments.empty() && std::string_view(arguments.front()) == "-a";
    const Arguments words = all ? arguments.subspan(1) : arguments;
    if (words.empty()) return listAll(all);
    if (words.size() == 1) return listOne(words.front());
    return changeInterface(words.front(), words.subspan(1));
}

}  // namespace hosttools
