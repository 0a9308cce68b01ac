#pragma once

#include <atomic>
#include <cstdint>
#include <deque>
#include <memory>
#include <mutex>
#include <string>
#include <thread>
#include <vector>

#include "agent/cli/remote/client.h"
#include "agent/cli/remote/values.h"
#include "agent/core/event_log.h"

namespace cvagent::remote {

/// The service's events, on a thread of its own, from the moment it is made to its end: each once, in their
/// order, whatever signals are lost, and whether or not the service or the bus is away meanwhile.
class EventFeed {
public:
    /// @param client asked for the number to begin behind; used no more afterwards
    EventFeed(Client& client, std::string address);
    EventFeed(const EventFeed&) = delete;
    EventFeed& operator=(const EventFeed&) = delete;
    ~EventFeed();

    std::shared_ptr<Subscription> subscribe(std::optional<Event::Kind> only);
    void start();
    /// Nothing comes any more.
    void stop();

private:
    using Clock = std::chrono::steady_clock;

    void serve();
    void follow(Client& client);
    void signalled(const std::string& owner, const bus::Message& signal);
    void catchUp(Client& client);
    void tell(const NumberedEvent& event);
    void tellPending(Client& client);
    bool pause() const;

    const std::string address_;
    std::uint64_t last_;                 // number of the last event that was told
    std::deque<NumberedEvent> pending_;  // signals that have come
    bool missed_ = false;                // one could not be read, or too many came
    bool away_ = false;                  // that it is has been told
    std::mutex guard_;
    std::vector<std::weak_ptr<Subscription>> subscribers_;  // guarded by guard_
    int stop_;                                              // readable when it is to end
    std::thread thread_;
};

}  // namespace cvagent::remote
