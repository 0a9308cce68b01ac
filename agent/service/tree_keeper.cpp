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
    std::map<std::string, int> linkOf;
    std::set<std::uint32_t> drives;
    for (const NodeRef& node : agent_.nodes()) {
        const std::uint32_t id = node->getNodeId();
        const std::string name = nameOf(*node);
        const Judgement judgement = judge(node, name, named);
        if (judgement != Judgement::present) {
            // The plug-in itself lets its drives go.
            const auto until = isDrive(*node) ? Clock::time_point::max() : now + kForItsAlert;
            const auto known = hidden_.find(id);
            hidden.emplace(id, judgement == Judgement::another ? now
                               : known != hidden_.end()        ? known->second
                                                               : until);
        }
        if (hidden.contains(id) && hidden[id] <= now) {
            toWithdraw.push_back(node);
        }
        if (const auto link = named.find(name); isOfLink(*node) && link != named.end()) {
            linkOf[name] = link->second->first;
        } else if (const auto before = linkOf_.find(name); before != linkOf_.end()) {
            linkOf.insert(*before);
        }
        if (presentDrives_.contains(id)) {
            drives.insert(id);
        }
    }
    hidden_ = std::move(hidden);
    linkOf_ = std::move(linkOf);
    presentDrives_ = std::move(drives);
    return toWithdraw;
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

void TreeKeeper::findNew(const Named& named, const Request& request) {
    std::erase_if(offered_, [&named](const auto& entry) {
        const auto link = named.find(entry.second);
        return link == named.end() || link->second->first != entry.first ||
               !isOfferable(link->second->second);
    });
    if (unseen(named).empty()) {
        return;
    }
    agent_.lookForLinks(request);
    const auto now = Clock::now();
    std::erase_if(leaving_, [now](const auto& entry) { return entry.second < now; });
    for (const HostLinks::value_type* link : unseen(named)) {
        if (leaving_.contains(link->second.name)) {
            retry_ = now + kRetry;  // its former node is still there for somebody
        } else {
            offered_[link->first] = link->second.name;
        }
    }
}

void TreeKeeper::follow(const HostLinks& links, const Request& request) {
    Named named;
    for (const auto& link : links) {
        named.emplace(link.second.name, &link);
    }
    retry_ = Clock::now() + kRetry;  // unless all of this is done
    if (const std::vector<NodeRef> toWithdraw = sort(named); !toWithdraw.empty()) {
        agent_.withdraw(toWithdraw, request);
        for (const NodeRef& node : toWithdraw) {
            hidden_.erase(node->getNodeId());
            leaving_[nameOf(*node)] = Clock::now() + kLongestLeave;
        }
    }
    retry_.reset();
    findNew(named, request);
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
