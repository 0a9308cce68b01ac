#include "agent/cli/remote/event_feed.h"

#include <poll.h>
#include <sys/eventfd.h>
#include <unistd.h>

#include <cerrno>
#include <cstring>
#include <utility>

#include "agent/bus/writer.h"
#include "agent/cli/print.h"
#include "agent/cli/remote/service.h"
#include "agent/service/names.h"
#include "agent/service/values.h"

namespace cvagent::remote {

namespace {

constexpr std::size_t kMostPending = 4096;
constexpr std::size_t kMostOfOneAnswer = 512;
constexpr int kPauseMilliseconds = 500;  // between two attempts to reach a service that is away

std::string eventsOf(const std::string& owner) {
    return "type='signal',sender='" + owner + "',interface='" + service::kAgentInterface + "',member='Event'";
}

std::string endOf(const std::string& owner) {
    return std::string("type='signal',sender='") + kBusDriver + "',member='NameOwnerChanged',arg0='" + owner +
           "'";
}

}  // namespace

EventFeed::EventFeed(Client& client, std::string address)
    : address_(std::move(address)),
      last_(client.numberProperty("LastEvent")),
      stop_(eventfd(0, EFD_CLOEXEC | EFD_NONBLOCK)) {
    if (stop_ < 0) {
        throw Failure(ExitStatus::failed, std::string("cannot wait for events: ") + std::strerror(errno));
    }
}

EventFeed::~EventFeed() {
    stop();
    close(stop_);
}

std::shared_ptr<Subscription> EventFeed::subscribe(std::optional<Event::Kind> only) {
    auto subscription = std::make_shared<Subscription>(EventLog::kMost, only);
    const std::lock_guard lock(guard_);
    subscribers_.push_back(subscription);
    return subscription;
}

void EventFeed::start() {
    thread_ = std::thread([this] { serve(); });
}

void EventFeed::stop() {
    if (thread_.joinable()) {
        eventfd_write(stop_, 1);
        thread_.join();
    }
}

/// What is away comes back: systemd starts a service that has crashed again.
void EventFeed::serve() {
    for (bool more = true; more; more = pause()) {
        try {
            Client client(address_, stop_);
            follow(client);
        } catch (const Client::Stopped&) {
            return;
        } catch (const std::runtime_error& error) {
            if (!std::exchange(away_, true)) {
                complain(std::string(error.what()) + "; waiting for the service");
            }
        }
    }
}

/// @return false when it is to end
bool EventFeed::pause() const {
    pollfd stopped{stop_, POLLIN, 0};
    return poll(&stopped, 1, kPauseMilliseconds) <= 0;
}

/// Listens first and then asks for what came before, so that nothing falls between.
void EventFeed::follow(Client& client) {
    bool gone = false;
    [[maybe_unused]] const bus::Slot events = client.connection().match(
        eventsOf(client.owner()),
        [this, &client](const bus::Message& signal) { signalled(client.owner(), signal); });
    [[maybe_unused]] const bus::Slot end = client.connection().match(
        endOf(client.owner()), [&gone](const bus::Message& signal) { gone = signal.sender() == kBusDriver; });
    if (client.numberProperty("LastEvent") < last_) {
        last_ = 0;  // one that keeps no history counts anew
    }
    catchUp(client);
    if (std::exchange(away_, false)) {
        complain("the service is there again");
    }
    while (!gone) {
        client.wait(Clock::time_point::max());
        tellPending(client);
    }
    throw ServiceGone("the service has ended");
}

/// A signal that comes to us alone passes the match, whoever has sent it.
void EventFeed::signalled(const std::string& owner, const bus::Message& signal) {
    if (signal.sender() != owner) {
        return;
    }
    try {
        bus::Reader reader(signal);
        pending_.push_back(takeEvent(reader));
    } catch (const bus::Error&) {
        missed_ = true;
    }
    if (pending_.size() > kMostPending) {
        pending_.clear();
        missed_ = true;
    }
}

/// A signal may have come while its event was asked for.
void EventFeed::tellPending(Client& client) {
    while (!pending_.empty()) {
        const NumberedEvent event = std::move(pending_.front());
        pending_.pop_front();
        if (event.number == last_ + 1) {
            tell(event);
        } else if (event.number > last_) {
            catchUp(client);
        }
    }
    if (std::exchange(missed_, false)) {
        catchUp(client);
    }
}

void EventFeed::catchUp(Client& client) {
    for (bool more = true; more;) {
        const std::uint64_t begin = last_;
        const bus::Message call = client.call("EventsSince");
        bus::Writer(call).put(begin);
        std::size_t count = 0;
        const bus::Message answer = client.ask(call, Client::kShort);
        client.read(answer, [&](bus::Reader& reader) {
            reader.array(service::kEventType, [&] {
                tell(takeEvent(reader));
                ++count;
            });
            if (const std::uint64_t dropped = reader.longNumber(); dropped > 0) {
                complain(std::to_string(dropped) + " events are not kept any more");
            }
        });
        more = count >= kMostOfOneAnswer && last_ > begin;
    }
}

void EventFeed::tell(const NumberedEvent& event) {
    last_ = event.number;
    const std::lock_guard lock(guard_);
    for (const auto& subscriber : subscribers_) {
        if (const auto listening = subscriber.lock(); listening && event.event) {
            listening->put(*event.event);
        }
    }
}

}  // namespace cvagent::remote
