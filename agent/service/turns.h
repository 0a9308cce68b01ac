#pragma once

#include <cstddef>
#include <cstdint>
#include <deque>
#include <functional>
#include <map>

#include "agent/bus/connection.h"
#include "agent/service/loop.h"

namespace cvagent::service {

/// Large answers are made one by one, as the bus takes them: made at once, those to many clients would fill
/// the memory. Users take turns.
class Turns {
public:
    using Work = std::function<void()>;

    Turns(const bus::Connection& connection, Loop& loop) : connection_(connection), loop_(loop) {}

    /// Does it now or later, on the loop's thread. @return whether there is room for it
    bool submit(std::uint32_t user, Work work);

private:
    void proceed();
    Work next();

    const bus::Connection& connection_;
    Loop& loop_;
    Loop::Source timer_;
    std::map<std::uint32_t, std::deque<Work>> waiting_;  // by user
    std::size_t count_ = 0;
    std::uint32_t last_ = 0;
};

}  // namespace cvagent::service
