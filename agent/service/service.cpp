#include "agent/service/service.h"

#include <malloc.h>

#include <utility>

#include "agent/bus/reader.h"
#include "agent/bus/writer.h"
#include "agent/service/names.h"
#include "agent/service/values.h"

namespace cvagent::service {

namespace {

// Most of a read is waiting for the host's tools; one write at a time is the agent's rule anyway.
constexpr Workers::Limits kReaders{8, 128, 512};
constexpr Workers::Limits kWriters{1, 16, 64};
// A plan is a walk over the host; and each of these may hold a long list of changes.
constexpr Workers::Limits kPlanners{1, 16, 64};
constexpr Workers::Limits kLookups{1, 8, 32};
constexpr Workers::Limits kConfirmers{1, 8, 32};
constexpr std::chrono::seconds kBusTime{10};

bus::Message busCall(const bus::Connection& connection, const std::string& member) {
    bus::Message call =
        connection.newCall({"org.freedesktop.DBus", "/org/freedesktop/DBus", "org.freedesktop.DBus", member});
    bus::Writer(call).put(kBusName);
    return call;
}

}  // namespace

std::string whoServes(const bus::Connection& connection) {
    if (!bus::Reader(connection.ask(busCall(connection, "NameHasOwner"), kBusTime)).flag()) {
        return "";
    }
    try {
        const auto process = connection.ask(busCall(connection, "GetConnectionUnixProcessID"), kBusTime);
        return "process " + std::to_string(bus::Reader(process).number());
    } catch (const bus::Error&) {
        return "a process that the bus does not name";
    }
}

Service::Service(Loop& loop, bus::Connection& connection, Agent& agent, const Config& config,
                 change::RehearsalSettings rehearsal, EventSource past, std::uint64_t lastEvent)
    : loop_(loop),
      connection_(connection),
      agent_(agent),
      config_(config),
      changes_(connection, loop),
      callers_(connection),
      consent_(connection),
      looker_(agent,
              [this, mailbox = loop.mailbox()](Look look) {
                  mailbox->post(
                      [this, held = std::make_shared<Look>(std::move(look))] { take(std::move(*held)); });
              }),
      unread_(connection, loop),
      turns_(connection, loop, unread_),
      readers_(kReaders),
      writers_(kWriters),
      planners_(kPlanners),
      lookups_(kLookups),
      confirmers_(kConfirmers),
      parts_{connection,     agent,    model_,    callers_, consent_,    turns_,         unread_,
             readers_,       writers_, planners_, lookups_, confirmers_, loop.mailbox(), std::move(rehearsal),
             std::move(past)},
      objects_(parts_, standing_) {
    changes_.whenSent([this] { unread_.signalled(); });
    parts_.rehearsal.goesOn = [this] { return !ends_; };
    standing_.version = CORVISTA_VERSION;
    standing_.lastEvent = lastEvent;
    configure(config);
}

/// What comes back from other threads would find nothing of this any more, and they nothing of the parts. The
/// mailbox takes the calls that they let go of until the last has ended.
Service::~Service() {
    windDown();
    for (Workers* workers : {&lookups_, &planners_, &readers_, &confirmers_, &writers_}) {
        workers->end();
    }
    loop_.mailbox()->close();
}

void Service::begin(const LinkIndices& linksBefore) {
    events_ = agent_.subscribe(standing_.lastEvent);
    take(looker_.firstLook(linksBefore));
    standing_.startedAt = standing_.lookedAt;
    objects_.serve();
    consent_.lookForPolkit();
    if (!connection_.acquireName(kBusName)) {
        throw Problem(Problem::busy, "another agent is on this bus already: " + whoServes(connection_));
    }
    changes_.begin(model_);
    eventsCome_ = loop_.whenReadable(events_->descriptor(), [this] { takeEvents(); });
    looker_.start();
    hostWatch_.emplace(loop_, looker_);
    armLook();
}

void Service::configure(const Config& config) {
    config_ = config;
    consent_.setTrustedGroup(config.trustedGroup);
    looker_.setSettlingTime(config.settlingTime);
    if (nextLook_ || !config.lookEvery.count()) {
        armLook();
    }
}

void Service::armLook() {
    nextLook_.reset();
    if (events_ && config_.lookEvery.count() > 0) {
        nextLook_ = loop_.after(config_.lookEvery, [this] {
            looker_.lookAtAll();
            armLook();
        });
    }
}

void Service::take(Look look) {
    const bool isWhole = look.whole;
    model_.apply(std::move(look));
    ++looks_;
    if (isWhole) {
        standing_.lookedAt = wallClock();
    }
}

/// The library keeps what is free between pieces that live long.
void Service::giveBack() {
    if (const std::uint64_t done = looks_ + objects_.handled(); std::exchange(doneBefore_, done) != done) {
        malloc_trim(0);
    }
}

void Service::takeEvents() {
    const Subscription::Taken taken = events_->take();
    if (taken.dropped > 0) {
        looker_.lookAtAll();
    }
    for (const Event& event : taken.events) {
        standing_.lastEvent = event.number;
        follow(event);
        changes_.happened(event);
    }
}

void Service::follow(const Event& event) {
    if (event.kind == Event::Kind::withdrawn) {
        model_.withdraw(event.nodeId, looker_.begun());
    } else if (event.kind == Event::Kind::written) {
        looker_.wrote(event.nodeId);
    } else if (event.nodeId != 0) {
        looker_.lookAgain(event.nodeId);
    }
    if (event.kind == Event::Kind::alert && event.nodeId != 0) {
        looker_.alertCame(event.nodeId);
    }
}

void Service::windDown() {
    nextLook_.reset();
    hostWatch_.reset();
    looker_.stop();
    ends_ = true;
    readers_.stop();
    planners_.stop();
    lookups_.stop();
    confirmers_.stop();
}

}  // namespace cvagent::service
