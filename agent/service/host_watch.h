#pragma once

#include "agent/service/announcements.h"
#include "agent/service/looker.h"
#include "agent/service/loop.h"

namespace cvagent::service {

/// Hears what the kernel announces of links, addresses, routes and drives, and tells what that concerns.
/// However much is announced, it is taken in at most fifty times a second. The loop's thread.
class HostWatch {
public:
    /// Both outlive it. It begins with what links there are.
    HostWatch(Loop& loop, Looker& looker);

private:
    void listen();
    void take();
    bool listLinks();
    void pauseListening(std::chrono::milliseconds time);

    Loop& loop_;
    Looker& looker_;
    Announcements routes_;
    Announcements devices_;
    HostLinks links_;
    bool incomplete_ = true;  // some were missed: what there is has to be asked for
    Loop::Source routesCome_;
    Loop::Source devicesCome_;
    Loop::Source pause_;
};

}  // namespace cvagent::service
