#pragma once

#include <cstdint>
#include <functional>

#include "agent/bus/connection.h"
#include "agent/service/loop.h"
#include "agent/service/turn_queue.h"
#include "agent/service/unread.h"

namespace cvagent::service {

/// Large answers are made one by one, as the bus takes them: made at once, those to many clients would fill
/// the memory. Users take turns.
class Turns {
public:
    using Work = std::function<void()>;

    Turns(const bus::Connection& connection, Loop& loop, const Unread& unread)
        : connection_(connection), loop_(loop), unread_(unread) {}

    /// Does it now or later, on the loop's thread. @return whether there is room for it
    bool submit(std::uint32_t user, Work work);

private:
    void proceed();

    const bus::Connection& connection_;
    Loop& loop_;
    const Unread& unread_;
    Loop::Source timer_;
    TurnQueue<Work> waiting_;
};

}  // namespace cvagent::service
