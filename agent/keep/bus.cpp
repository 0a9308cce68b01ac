#include "agent/keep/bus.h"

#include <poll.h>

#include <algorithm>

#include "agent/bus/reader.h"
#include "agent/bus/writer.h"
#include "agent/keep/daemons.h"

namespace cvagent::keep {

namespace {

using Clock = std::chrono::steady_clock;

constexpr const char* kBusDriver = "org.freedesktop.DBus";

/// As poll takes it, never 0 for what is left of a millisecond.
int millisecondsUntil(Clock::time_point end) {
    const auto left = std::chrono::ceil<std::chrono::milliseconds>(end - Clock::now()).count();
    return static_cast<int>(std::max<long long>(left, 0));
}

}  // namespace

/// The library's own blocking call waits a minute and a half for a bus that does not greet.
bus::Message PatientBus::ask(const bus::Message& call, const std::string& service,
                             std::chrono::seconds longest) {
    bus::Message answer;
    if (!silent_.contains(service)) {
        const auto end = Clock::now() + longest;
        const bus::Slot waiting = connection_.askLater(
            call, longest + std::chrono::seconds(1), [&answer](const bus::Message& come) { answer = come; });
        connection_.process();
        while (!answer && Clock::now() < end) {
            const auto due = std::min(end, connection_.deadline().value_or(end));
            pollfd ready{connection_.descriptor(), connection_.events(), 0};
            poll(&ready, 1, millisecondsUntil(due));
            connection_.process();
        }
    }
    if (!answer) {
        silent_.insert(service);
        throw NoAnswer(service + " has not answered for " + std::to_string(longest.count()) + " s");
    }
    if (answer.isError()) {
        throw answer.error();
    }
    return answer;
}

/// A daemon that is not there stays away.
bus::Message PatientBus::call(const bus::Target& target) const {
    bus::Message call = connection_.newCall(target);
    sd_bus_message_set_auto_start(call.get(), 0);
    return call;
}

bool PatientBus::hasOwner(const std::string& name) {
    const bus::Message question = call({kBusDriver, "/org/freedesktop/DBus", kBusDriver, "NameHasOwner"});
    bus::Writer(question).put(name);
    return bus::Reader(ask(question, "the system's bus")).flag();
}

template <class Take>
void PatientBus::take(const bus::Target& property, const Take& take) {
    const bus::Message question =
        call({property.service, property.path, "org.freedesktop.DBus.Properties", "Get"});
    bus::Writer(question).put(property.interface).put(property.member);
    const bus::Message answer = ask(question, property.service);
    bus::Reader reader(answer);
    reader.variant([&](const std::string& /*type*/) { take(reader); });
}

bool PatientBus::flag(const bus::Target& property) {
    bool value = false;
    take(property, [&value](bus::Reader& reader) { value = reader.flag(); });
    return value;
}

std::uint32_t PatientBus::number(const bus::Target& property) {
    std::uint32_t value = 0;
    take(property, [&value](bus::Reader& reader) { value = reader.number(); });
    return value;
}

std::string PatientBus::path(const bus::Target& property) {
    std::string value;
    take(property, [&value](bus::Reader& reader) { value = reader.path(); });
    return value;
}

std::string PatientBus::text(const bus::Target& property) {
    std::string value;
    take(property, [&value](bus::Reader& reader) { value = reader.text(); });
    return value;
}

}  // namespace cvagent::keep
