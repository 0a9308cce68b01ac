#pragma once

#include <memory>

#include "agent/history/recorder.h"
#include "agent/service/calls.h"
#include "agent/service/config.h"

namespace cvagent::service {

/// The history of this host, as the service keeps and reads it.
class Past {
public:
    /// Opens it; what is wrong with it is told, and the service works without.
    Past();

    /// Keeps the agent's events.
    const std::shared_ptr<Recorder>& keeper() const { return recorder_; }
    /// The number of the last event of earlier runs; 0 for none.
    std::uint64_t last() const { return last_; }
    /// Any thread.
    static std::vector<Event> read(std::uint64_t after, std::uint64_t upTo, std::size_t most);
    /// How much is kept from now on.
    static void configure(const Config& config);

private:
    std::shared_ptr<Recorder> recorder_;
    std::uint64_t last_ = 0;
};

}  // namespace cvagent::service
