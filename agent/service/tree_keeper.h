#pragma once

#include <chrono>
#include <map>
#include <optional>
#include <set>
#include <string>
#include <vector>

#include "agent/core/agent.h"
#include "agent/service/host_links.h"

namespace cvagent::service {

/// Keeps the first plug-in's nodes of links and drives to those that the host has. That plug-in finds new
/// links only when it is told to look for them, and lets go of none; its drives it looks at once a minute.
/// The looker's thread.
class TreeKeeper {
public:
    using Clock = std::chrono::steady_clock;

    /// @param agent outlives it
    explicit TreeKeeper(Agent& agent) : agent_(agent) {}

    /// Notes which links the nodes are of that the plug-ins made at their start.
    /// @param before the links ahead of it
    void noteStart(const LinkIndices& before) { noteMade(before, {}); }
    /// Hides the nodes of what is gone and has new links found. Throws Problem (busy when a write is at work
    /// until the request's deadline); due() then says when to follow again.
    /// @return whether the plug-in was started anew for it, so that all of its nodes are other ones
    bool follow(const HostLinks& links, const Request& request);
    /// The nodes of what there is.
    std::vector<NodeRef> shown() const;
    /// An alert has come of a node: if it was kept for that, it may go.
    void alertCame(std::uint32_t node);
    /// When to follow again though nothing is heard.
    std::optional<Clock::time_point> due() const;

private:
    enum class Judgement { present, gone, another };
    using Named = std::map<std::string, const HostLinks::value_type*>;

    Judgement judge(const NodeRef& node, const std::string& name, const Named& named);
    Judgement judgeLink(const NodeRef& node, const std::string& name, const Named& named) const;
    Judgement judgeDrive(const NodeRef& node, const std::string& name);
    std::vector<NodeRef> sort(const Named& named);
    void noteMade(const LinkIndices& before, const std::set<std::uint32_t>& old);
    void remember(const Named& named);
    bool findNew(const Named& named, const Request& request);
    std::map<int, std::string> bondsWithoutTeam(const Named& named) const;
    bool restart(const Request& request);
    std::vector<const HostLinks::value_type*> unseen(const Named& named) const;

    Agent& agent_;
    std::map<std::uint32_t, Clock::time_point> hidden_;  // until when they are kept
    LinkIndices linkOf_;                                 // by the name of a node
    std::set<std::uint32_t> presentDrives_;              // that have been there
    std::map<int, std::string> offered_;                 // links that the plug-in makes no node of, by index
    std::map<int, std::string> refusedBonds_;            // that the plug-in made no team of, by index
    std::map<std::string, Clock::time_point>
        leaving_;  // names of withdrawn nodes that somebody may still hold
    std::optional<Clock::time_point> retry_;
    Clock::time_point nextRestart_;
};

/// The name in the last part of a node's path: "eth0" of "network-port:eth0".
std::string nameOf(const IC::MutableNode& node);

}  // namespace cvagent::service
