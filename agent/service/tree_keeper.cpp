#include "agent/service/tree_keeper.h"

#include <algorithm>
#include <filesystem>
#include <utility>

namespace cvagent::service {

namespace {

/// Two passes of the plug-in's network monitor: it tells of a link that is gone by the node that it still
/// has.
constexpr std::chrono::seconds kForItsAlert{65};
/// A node that was withdrawn lives on, and keeps its name, for as long as a read of it hangs.
constexpr std::chrono::seconds kLongestLeave{30};
constexpr std::chrono::milliseconds kRetry{100};
constexpr int kNoLink = -1;  // as an index
constexpr std::chrono::milliseconds kShortestRest{1000};

bool isOfType(const IC::MutableNode& node, std::initializer_list<NodeType> types) {
    return std::ranges::any_of(
        types, [&node](NodeType type) { return node.nodeType() == static_cast<unsigned int>(type); });
}

bool isOfLink(const IC::MutableNode& node) {
    return isOfType(node, {NodeType::networkPort, NodeType::ipConfig, NodeType::team});
}

bool isDrive(const IC::MutableNode& node) {
    return isOfType(node, {NodeType::hardDrive, NodeType::partition});
}

/// Whether the plug-in may make ports and configurations of it.
bool isOfferable(const HostLink& link) {
    return !link.isLoopback && !link.ofBridge && !link.zeroAddress;
}

}  // namespace

std::string nameOf(const IC::MutableNode& node) {
    const std::string part = pathComponent(node);
    const std::size_t colon = part.find(':');
    return colon == std::string::npos ? "" : part.substr(colon + 1);
}

TreeKeeper::Judgement TreeKeeper::judgeLink(const NodeRef& node, const std::string& name,
                                            const Named& named) const {
    const auto found = named.find(name);
    const auto before = linkOf_.find(name);
    const bool isTeam = isOfType(*node, {NodeType::team});
    if (found == named.end() ||
        !(isTeam ? found->second->second.isBond : isOfferable(found->second->second))) {
        // What never was a link of that name the plug-in has from elsewhere.
        return before == linkOf_.end() ? Judgement::present : Judgement::gone;
    }
    const bool isSame = before == linkOf_.end() || before->second == found->second->first;
    return isSame && !hidden_.contains(node->getNodeId()) ? Judgement::present : Judgement::another;
}

TreeKeeper::Judgement TreeKeeper::judgeDrive(const NodeRef& node, const std::string& name) {
    std::error_code unknown;
    if (std::filesystem::exists(std::filesystem::path("/sys/class/block") / name, unknown)) {
        presentDrives_.insert(node->getNodeId());
        return Judgement::present;
    }
    return presentDrives_.contains(node->getNodeId()) ? Judgement::gone : Judgement::present;
}

TreeKeeper::Judgement TreeKeeper::judge(const NodeRef& node, const std::string& name, const Named& named) {
    return isOfLink(*node)  ? judgeLink(node, name, named)
           : isDrive(*node) ? judgeDrive(node, name)
                            : Judgement::present;
}

/// Tells which nodes are hidden from now on.
/// @return those to withdraw
std::vector<NodeRef> TreeKeeper::sort(const Named& named) {
    const auto now = Clock::now();
    std::vector<NodeRef> toWithdraw;
    std::map<std::uint32_t, Clock::time_point> hidden;
    for (const NodeRef& node : agent_.nodes()) {
        const std::uint32_t id = node->getNodeId();
        const Judgement judgement = judge(node, nameOf(*node), named);
        if (judgement == Judgement::present) {
            continue;
        }
        const auto known = hidden_.find(id);
        const auto until = judgement == Judgement::another ? now
                           : known != hidden_.end()        ? known->second
                           : isDrive(*node)
                               ? Clock::time_point::max()  // the plug-in itself lets its drives go
                               : now + kForItsAlert;
        hidden.emplace(id, until);
        if (until <= now) {
            toWithdraw.push_back(node);
        }
    }
    hidden_ = std::move(hidden);
    return toWithdraw;
}

/// Which links the nodes are of that the plug-in has made since: those that had their names then. Where none
/// had, nobody knows which one the plug-in has seen.
/// @param old the nodes that there were; none at a start, which may have nodes from elsewhere
void TreeKeeper::noteMade(const LinkIndices& before, const std::set<std::uint32_t>& old) {
    for (const NodeRef& node : agent_.nodes()) {
        if (!isOfLink(*node) || old.contains(node->getNodeId())) {
            continue;
        }
        const std::string name = nameOf(*node);
        if (const auto link = before.find(name); link != before.end()) {
            linkOf_[name] = link->second;
        } else if (!old.empty()) {
            linkOf_[name] = kNoLink;
        }
    }
}

/// Forgets what no node is of any more.
void TreeKeeper::remember(const Named& named) {
    LinkIndices linkOf;
    std::set<std::uint32_t> drives;
    for (const NodeRef& node : agent_.nodes()) {
        const std::string name = nameOf(*node);
        if (presentDrives_.contains(node->getNodeId())) {
            drives.insert(node->getNodeId());
        }
        if (const auto before = linkOf_.find(name); before != linkOf_.end()) {
            linkOf.insert(*before);
        } else if (const auto link = named.find(name); isOfLink(*node) && link != named.end()) {
            linkOf[name] = link->second->first;
        }
    }
    linkOf_ = std::move(linkOf);
    presentDrives_ = std::move(drives);
}

/// The links that could have nodes and have none, without those that the plug-in has been asked for.
std::vector<const HostLinks::value_type*> TreeKeeper::unseen(const Named& named) const {
    std::set<std::string> seen;
    for (const NodeRef& node : shown()) {
        if (isOfType(*node, {NodeType::networkPort, NodeType::ipConfig})) {
            seen.insert(nameOf(*node));
        }
    }
    std::vector<const HostLinks::value_type*> links;
    for (const auto& [name, link] : named) {
        const auto offered = offered_.find(link->first);
        if (isOfferable(link->second) && !seen.contains(name) &&
            (offered == offered_.end() || offered->second != name)) {
            links.push_back(link);
        }
    }
    return links;
}

/// The bonds that have no team: the plug-in makes teams at its start alone. Those that it made none of are
/// left out.
std::map<int, std::string> TreeKeeper::bondsWithoutTeam(const Named& named) const {
    std::set<std::string> teams;
    for (const NodeRef& node : shown()) {
        if (isOfType(*node, {NodeType::team})) {
            teams.insert(nameOf(*node));
        }
    }
    std::map<int, std::string> bonds;
    for (const auto& [name, link] : named) {
        const auto refused = refusedBonds_.find(link->first);
        if (link->second.isBond && !teams.contains(name) &&
            (refused == refusedBonds_.end() || refused->second != name)) {
            bonds.emplace(link->first, name);
        }
    }
    return bonds;
}

/// A start costs a walk over everything, so it takes one part in ten of the time at most.
bool TreeKeeper::restart(const Request& request) {
    const auto begun = Clock::now();
    const std::vector<NodeRef> nodes = agent_.nodes();
    const auto own = std::ranges::find_if(
        nodes, [](const NodeRef& node) { return isOfType(*node, {NodeType::networkController}); });
    if (own == nodes.end()) {
        return false;  // not that plug-in
    }
    if (begun < nextRestart_) {
        retry_ = nextRestart_;
        return false;
    }
    constexpr int kRest = 9;
    agent_.restartPluginOf(*own, request);
    const auto ended = Clock::now();
    nextRestart_ = ended + std::max<Clock::duration>(kShortestRest, kRest * (ended - begun));
    hidden_.clear();
    presentDrives_.clear();
    return true;
}

/// @return whether the plug-in was started anew
bool TreeKeeper::findNew(const Named& named, const Request& request) {
    std::erase_if(offered_, [&named](const auto& entry) {
        const auto link = named.find(entry.second);
        return link == named.end() || link->second->first != entry.first ||
               !isOfferable(link->second->second);
    });
    const bool asked = unseen(named).empty() || agent_.lookForLinks(request);
    retry_.reset();
    const bool restarted = (!asked || !bondsWithoutTeam(named).empty()) && restart(request);
    if (restarted) {
        refusedBonds_.clear();
        refusedBonds_ = bondsWithoutTeam(named);
    }
    const auto now = Clock::now();
    std::erase_if(leaving_, [now](const auto& entry) { return entry.second < now; });
    for (const HostLinks::value_type* link : unseen(named)) {
        if (leaving_.contains(link->second.name)) {
            retry_ = now + kRetry;  // its former node is still there for somebody
        } else if (asked || restarted) {
            offered_[link->first] = link->second.name;
        }
    }
    return restarted;
}

bool TreeKeeper::follow(const HostLinks& links, const Request& request) {
    Named named;
    for (const auto& link : links) {
        named.emplace(link.second.name, &link);
    }
    const LinkIndices before = linkIndices();
    std::set<std::uint32_t> old;
    for (const NodeRef& node : agent_.nodes()) {
        old.insert(node->getNodeId());
    }
    retry_ = Clock::now() + kRetry;  // unless all of this is done
    if (const std::vector<NodeRef> toWithdraw = sort(named); !toWithdraw.empty()) {
        agent_.withdraw(toWithdraw, request);
        for (const NodeRef& node : toWithdraw) {
            hidden_.erase(node->getNodeId());
            leaving_[nameOf(*node)] = Clock::now() + kLongestLeave;
        }
    }
    const bool restarted = findNew(named, request);
    noteMade(before, old);
    remember(named);
    return restarted;
}

std::vector<NodeRef> TreeKeeper::shown() const {
    std::vector<NodeRef> nodes = agent_.nodes();
    std::erase_if(nodes, [this](const NodeRef& node) { return hidden_.contains(node->getNodeId()); });
    return nodes;
}

void TreeKeeper::alertCame(std::uint32_t node) {
    if (const auto hidden = hidden_.find(node);
        hidden != hidden_.end() && hidden->second != Clock::time_point::max()) {
        hidden->second = Clock::now();
    }
}

std::optional<TreeKeeper::Clock::time_point> TreeKeeper::due() const {
    std::optional<Clock::time_point> first = retry_;
    for (const auto& [id, until] : hidden_) {
        if (until != Clock::time_point::max() && (!first || until < *first)) {
            first = until;
        }
    }
    return first;
}

}  // namespace cvagent::service
