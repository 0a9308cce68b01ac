#pragma once

#include <chrono>
#include <functional>
#include <memory>
#include <string>
#include <vector>

#include "agent/core/event_keeper.h"
#include "agent/core/event_log.h"
#include "agent/core/log_output.h"
#include "agent/core/node_ref.h"
#include "agent/core/plugin.h"
#include "agent/core/problem.h"
#include "agent/core/reader.h"
#include "agent/core/surroundings.h"
#include "agent/core/writer.h"

namespace cvagent {

/// What an agent is made of; see PreparedProcess::agentSettings.
struct AgentSettings {
    /// Files; each brings its nodes into the one tree, and a file of names beside it (catalogue_file.h).
    /// Where a word could mean nodes of several, the first of them decides.
    std::vector<std::string> plugins;
    /// Opened before; null: the plug-ins' lines go nowhere.
    std::shared_ptr<LogOutput> log;
    /// Whether the plug-ins build their nodes of processors, which is asked of them apart from their start.
    bool processors = true;
    /// How long a command of a plug-in may take, in a write ten times as long; 0 for ever.
    std::chrono::duration<double> commandTime{10};
    /// How long each of several plug-ins may take to start, but for the one for this system, whose commands
    /// are limited; one that takes longer has failed and is left to itself.
    std::chrono::milliseconds startTime{30'000};
    /// Held for as long as the agent is; there is none without.
    std::shared_ptr<DataDirectory> data;
    /// Hears of what belongs to no call. Any thread.
    Tell tell = tellNobody;
    /// Hears each alert before the plug-in takes it for told, on the plug-in's thread: what nobody has heard
    /// when the process is ended is told by the next agent. Null: subscriptions alone hear of alerts.
    std::function<void(const Event&)> alertTold;
    /// Gives the events their numbers and keeps them, before anybody hears of them. Null: they are numbered
    /// and kept by the agent alone.
    std::shared_ptr<EventKeeper> keeper;
    /// Behind each write; null: what a plug-in writes to files only stays there until the host reads them.
    BringIntoForce bringIntoForce = nullptr;
    /// Number of the last event that was told before; the agent's begin behind it where no keeper gives
    /// others.
    std::uint64_t lastEvent = 0;
};

/// Plug-ins at work: the one agent behind every front end. It owns data directory, log, deadline of commands,
/// threads and plug-ins. It changes nothing of the process: that is done before, by PreparedProcess. All
/// operations may be called from many threads at once.
class Agent {
public:
    /// Loads every plug-in, one after the other, and starts them side by side. Throws std::invalid_argument
    /// without a data directory. One that fails costs nothing of the others; when all fail, the first one's
    /// Problem is thrown.
    explicit Agent(const AgentSettings& settings);
    Agent(const Agent&) = delete;
    Agent& operator=(const Agent&) = delete;
    /// Waits a while for calls whose callers have gone. The plug-ins are stopped when the last NodeRef has
    /// gone, too; a call that hangs for ever has one, and a program that has such a call ends by _exit.
    ~Agent();

    struct FailedPlugin {
        std::string file;
        Problem problem;
    };
    /// The plug-ins that could not be loaded or started.
    const std::vector<FailedPlugin>& failedPlugins() const;
    /// The files of the plug-ins at work.
    std::vector<std::string> plugins() const;

    std::vector<NodeRef> nodes() const;
    /// The node a person means; see findNode in tree.h. Throws Problem: notFound, ambiguous.
    NodeRef find(const std::string& text) const;

    /// See Reader::read.
    std::vector<Reading> read(const NodeRef& node, const std::vector<unsigned int>& ids, Freshness freshness,
                              const Request& request) const;
    /// What a tree shows of each of the nodes, in their order: what is stored, but that which a read can tell
    /// otherwise is read now, on all nodes side by side.
    std::vector<std::vector<Reading>> readTree(const std::vector<NodeRef>& nodes,
                                               const Request& request) const;
    /// Properties of a node that are asked together, ascending; none: all that a tree shows of it.
    struct Asked {
        NodeRef node;
        std::vector<unsigned int> ids{};
    };
    /// What is so now of many nodes, side by side. What the plug-in stores once, when it makes a node, and
    /// does not read again, is asked for (oshw/start_facts.h), or follows from the answers and is stored anew
    /// (oshw/stored_facts.h).
    /// @return the readings of each, in the order of the ids; nothing of what the host does not have
    std::vector<std::vector<Reading>> readAnew(const std::vector<Asked>& asked, const Request& request) const;
    /// See Writer::write. What may be written is judged before: see property_words.h.
    WriteResult write(const NodeRef& node, const Property& row, const IC::PropertyValue& value,
                      const Request& request) const;

    // Of long-lived front ends, which hear of changes before the plug-ins do. They keep out of writes, whose
    // turns they wait for; they throw Problem (busy) when there is none until the request's deadline.
    /// Has the plug-in of the links look for those that have appeared; new nodes are told as events.
    /// @return false when no node is there through which it could be asked
    bool lookForLinks(const Request& request) const;
    /// Takes nodes out of their plug-ins whose things are gone; told as events.
    void withdraw(const std::vector<NodeRef>& nodes, const Request& request) const;
    /// Stops the plug-in of a node and starts it anew: what it finds at a start alone is found. Its nodes
    /// have other ids then; told as events are those that come or go by their paths.
    void restartPluginOf(const NodeRef& node, const Request& request) const;
    void setStatus(const NodeRef& node, unsigned int status) const;

    /// A front end has found out by itself that something has changed.
    void announce(const Event& event) const;
    /// See EventLog. A subscription outlives the agent: the last events come while the plug-ins stop.
    std::shared_ptr<Subscription> subscribe(std::uint64_t after, std::optional<Event::Kind> only = {}) const;

private:
    struct Engine;
    std::shared_ptr<Engine> engine_;  // NodeRefs hold it, too
};

}  // namespace cvagent
