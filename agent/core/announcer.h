#pragma once

#include <functional>
#include <map>
#include <mutex>
#include <set>
#include <string>
#include <utility>

#include "agent/core/event.h"
#include "agent/core/facts.h"
#include "framework/ic/management_interface.h"

namespace cvagent {

/// Makes events of what the plug-ins tell and of what writes bring about, and keeps the facts in step with
/// them. Successive events about one property are a chain: each begins with the state that the one before has
/// told. Any thread.
class Announcer : public Listener {
public:
    /// Both outlive it.
    /// @param events where they go; an event is known to be told when hear() has returned
    /// @param alertTold hears each alert on the thread that brings it, before the plug-in goes on; null:
    /// nobody
    Announcer(Listener& events, Facts& facts, std::function<void(const Event&)> alertTold = nullptr)
        : events_(events), facts_(facts), alertTold_(std::move(alertTold)) {}

    void hear(const Event& event) override;
    /// The nodes of a start: no news, but known from now on.
    void takeStock(const IC::ManagementInterface& interface);
    /// A plug-in has started anew: only the nodes that were there before alone, or are there now alone, are
    /// told.
    void announceRestart(const std::vector<std::shared_ptr<IC::MutableNode>>& before,
                         const IC::ManagementInterface& interface);
    /// Nodes that have appeared without the plug-in's telling are told. A write can make some.
    void announceNew(const IC::ManagementInterface& interface);
    /// What a write came to; the texts are those of its event.
    struct Write {
        const Reading& before;
        const Reading& after;
        std::string caller;
        std::string wanted;
        std::string verdict;
        std::string plan;  ///< see Request
        bool refused;      ///< by the plug-in: the host is as it was told last
    };
    void announceWrite(const IC::MutableNode& node, const Write& write);

private:
    using Key = std::pair<unsigned int, unsigned int>;  // node and property

    void tellPublished(const Event& event);
    void tellWithdrawn(const Event& event);
    void forget(unsigned int node);
    void tellAlert(Event event);

    Listener& events_;
    Facts& facts_;
    const std::function<void(const Event&)> alertTold_;
    std::mutex guard_;  // guards everything below, and that events are told in the order of states
    std::set<unsigned int> early_;     // told before the plug-in did
    std::map<Key, std::string> told_;  // the state that the last event told
};

}  // namespace cvagent
