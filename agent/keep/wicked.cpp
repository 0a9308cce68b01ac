#include "agent/keep/daemons.h"
#include "agent/keep/host_files.h"
#include "agent/keep/systems.h"

namespace cvagent::keep {

namespace {

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

}  // namespace cvagent::keep
