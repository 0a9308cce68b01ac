#include "agent/core/oshw/unshown_links.h"

#include <net/if_arp.h>

#include <algorithm>
#include <filesystem>
#include <fstream>
#include <set>

namespace cvagent::oshw {

namespace {

namespace fs = std::filesystem;

constexpr const char* kLinks = "/sys/class/net";
constexpr unsigned int kLinkName = 108;
constexpr unsigned int kTeamName = 197;

bool isLoopback(const fs::path& link) {
    int type = 0;
    return std::ifstream(link / "type") >> type && type == ARPHRD_LOOPBACK;
}

/// A bond's driver keeps a file of its own among the links. The members of a bridge are shown by their
/// bridge.
bool couldHaveNode(const fs::path& place) {
    std::error_code unknown;
    return fs::exists(place / "ifindex", unknown) && !fs::exists(place / "brport", unknown) &&
           !isLoopback(place);
}

std::set<std::string> shownNames(const std::vector<NodeRef>& nodes) {
    std::set<std::string> names;
    for (const NodeRef& node : nodes) {
        const Properties stored = storedProperties(*node);
        for (const unsigned int id : {kLinkName, kTeamName}) {
            if (const auto name = stored.find(id); name != stored.end()) {
                names.insert(static_cast<std::string>(name->second));
            }
        }
    }
    return names;
}

}  // namespace

std::vector<std::string> unshownLinks(const std::vector<NodeRef>& nodes) {
    const bool showsLinks = std::ranges::any_of(nodes, [](const NodeRef& node) {
        return node->nodeType() == static_cast<unsigned int>(NodeType::networkController);
    });
    std::vector<std::string> unshown;
    if (!showsLinks) {
        return unshown;
    }
    const std::set<std::string> shown = shownNames(nodes);
    std::error_code unknown;
    for (const auto& place : fs::directory_iterator(kLinks, unknown)) {
        const std::string name = place.path().filename();
        if (!shown.contains(name) && couldHaveNode(place.path())) {
            unshown.push_back(name);
        }
    }
    std::ranges::sort(unshown);
    return unshown;
}

}  // namespace cvagent::oshw
