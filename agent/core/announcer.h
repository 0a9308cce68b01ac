#pragma once

#include <mutex>
#include <set>

#include "agent/core/event_log.h"
#include "agent/core/facts.h"
#include "framework/ic/management_interface.h"

namespace cvagent {

/// Makes events of what the plug-ins tell and of what writes bring about, and keeps the facts in step with
/// them. Any thread.
class Announcer : public Listener {
public:
    /// Both outlive it.
    Announcer(EventLog& events, Facts& facts) : events_(events), facts_(facts) {}

    void hear(const Event& event) override;
    /// The nodes of a start: no news, but known from now on.
    void takeStock(const std::vector<Handle>& nodes);
    /// Nodes that have appeared without the plug-in's telling are told. A write can make some.
    void announceNew(const IC::ManagementInterface& interface);
    void announceWrite(const IC::MutableNode& node, const Reading& before, const Reading& after,
                       const std::string& caller);

private:
    void hearAlert(Event event);

    EventLog& events_;
    Facts& facts_;
    std::mutex guard_;
    std::set<unsigned int> early_;  // told before the plug-in did; guarded by guard_
};

}  // namespace cvagent
