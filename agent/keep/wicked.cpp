#include "agent/core/text.h"
#include "agent/keep/daemons.h"
#include "agent/keep/host_files.h"
#include "agent/keep/ifcfg_editor.h"
#include "agent/keep/systems.h"
#include "agent/keep/way.h"

namespace cvagent::keep {

namespace {

constexpr const char* kDirectory = "/etc/sysconfig/network/";
constexpr std::string_view kBegin = "<origin>";
constexpr std::string_view kEnd = "</origin>";

/// "compat:suse:/etc/sysconfig/network/ifcfg-eth0"
std::string originIn(const std::string& state) {
    const std::size_t begin = state.find(kBegin);
    const std::size_t end = begin == std::string::npos ? begin : state.find(kEnd, begin);
    return end == std::string::npos ? "" : state.substr(begin + kBegin.size(), end - begin - kBegin.size());
}

}  // namespace

/// It notes in a file of the link's number what it has set a link up from.
std::optional<Claim> claimOfWicked(const Link& link, Daemons& daemons) {
    const auto state = smallFile("/run/wicked/state-" + std::to_string(link.index) + ".xml");
    const std::string origin = originIn(state.value_or(""));
    if (origin.empty() || !daemons.runs("org.opensuse.Network", "wickedd")) {
        return std::nullopt;
    }
    const std::size_t path = origin.find('/');
    return Claim{"wicked", "wicked has set it up from " + origin,
                 path == std::string::npos ? "" : origin.substr(path)};
}

Way wayOfWicked(const Link& link, const Claim& claim, const Wish& wish) {
    const std::string own = kDirectory + std::string("ifcfg-") + link.name;
    if (claim.source != own) {
        throw CannotKeep("wicked has it from " + inQuotes(claim.source) + ", not from a file of its own");
    }
    if (wish.nameServers || wish.searchDomains) {
        throw CannotKeep("wicked keeps name servers and domains elsewhere");
    }
    const auto settings = smallFile(own);
    if (!settings) {
        throw CannotKeep("cannot read " + own);
    }
    const std::string routesPath = kDirectory + std::string("ifroute-") + link.name;
    const auto routes = smallFile(routesPath);
    Wish routing = wish;
    if (wish.dhcp && !*wish.dhcp && isIfcfgByDhcp(*settings)) {
        routing.ipv4 = wish.ipv4.behindDhcp();
    }
    const std::string edited = editedIfroute(routes.value_or(""), routing);
    return {claim.system,
            {},
            {{own, settings, editedIfcfg(*settings, wish)},
             {routesPath, routes, edited == routes.value_or("") ? routes : std::optional(edited)}},
            {"wicked ifreload " + link.name}};
}

}  // namespace cvagent::keep
