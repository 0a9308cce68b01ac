#include "agent/bus/connection.h"

#include <cerrno>
#include <cstdlib>
#include <exception>
#include <limits>
#include <optional>
#include <utility>

#include "agent/bus/text.h"

namespace cvagent::bus {

namespace {

void checkDone(int result, const std::string& what) {
    if (result < 0) {
        throw Error::ofErrno(what, result);
    }
}

/// The library takes 0 for its own idea of a long time.
std::uint64_t limitOf(Connection::Microseconds longest) {
    return longest.count() <= 0 ? 1 : static_cast<std::uint64_t>(longest.count());
}

std::string systemBus() {
    const char* told = secure_getenv("DBUS_SYSTEM_BUS_ADDRESS");
    return told != nullptr ? told : "unix:path=/run/dbus/system_bus_socket";
}

/// No descriptors: those of calls that wait would fill the process's table.
sd_bus* opened(const std::string& address) {
    const bool system = address == "system";
    const std::string failure = system ? "cannot reach the system's bus" : "cannot reach the bus " + address;
    sd_bus* bus = nullptr;
    checkDone(sd_bus_new(&bus), failure);
    std::unique_ptr<sd_bus, decltype(&sd_bus_unref)> held(bus, &sd_bus_unref);
    checkDone(sd_bus_set_address(bus, system ? systemBus().c_str() : address.c_str()), failure);
    checkDone(sd_bus_set_bus_client(bus, 1), failure);
    checkDone(sd_bus_negotiate_fds(bus, 0), failure);
    checkDone(sd_bus_start(bus), failure);
    return held.release();
}

}  // namespace

struct Connection::Registered {
    const Connection* connection;
    Handler handler;
};

void Connection::Close::operator()(sd_bus* bus) const {
    sd_bus_close_unref(bus);
}

Connection::Connection(const std::string& address) : bus_(opened(address)) {}

Connection::~Connection() = default;

std::string Connection::uniqueName() const {
    const char* name = nullptr;
    checkDone(sd_bus_get_unique_name(get(), &name), "the bus gives no name");
    return name;
}

Message Connection::newCall(const Target& target) const {
    sd_bus_message* made = nullptr;
    checkDone(sd_bus_message_new_method_call(get(), &made, target.service.c_str(), target.path.c_str(),
                                             target.interface.c_str(), target.member.c_str()),
              "cannot make a call of " + target.member);
    return Message::adopt(made);
}

Message Connection::newSignal(const std::string& path, const std::string& interface,
                              const std::string& member) const {
    sd_bus_message* made = nullptr;
    checkDone(sd_bus_message_new_signal(get(), &made, path.c_str(), interface.c_str(), member.c_str()),
              "cannot make the signal " + member);
    return Message::adopt(made);
}

Message Connection::ask(const Message& call, Microseconds longest) const {
    sd_bus_error error{};
    sd_bus_message* answer = nullptr;
    const int result = sd_bus_call(get(), call.get(), limitOf(longest), &error, &answer);
    const std::string name = error.name != nullptr ? error.name : "";
    const std::string text = error.message != nullptr ? error.message : "";
    sd_bus_error_free(&error);
    if (result < 0 && name.empty()) {
        throw Error::ofErrno("no answer", result);
    }
    if (result < 0) {
        throw Error(name, text);
    }
    return Message::adopt(answer);
}

Slot Connection::askLater(const Message& call, Microseconds longest, Handler handler) {
    const auto registered = std::make_shared<Registered>(Registered{this, std::move(handler)});
    sd_bus_slot* slot = nullptr;
    checkDone(sd_bus_call_async(get(), &slot, call.get(), called, registered.get(), limitOf(longest)),
              "cannot call " + call.member());
    return {slot, registered};
}

void Connection::send(const Message& message) const {
    checkDone(sd_bus_send(get(), message.get(), nullptr), "cannot send to the bus");
}

std::uint64_t Connection::unsent() const {
    std::uint64_t count = 0;
    return sd_bus_get_n_queued_write(get(), &count) < 0 ? 0 : count;
}

bool Connection::flush() const {
    return sd_bus_flush(get()) >= 0;
}

Slot Connection::match(const std::string& rule, Handler handler) {
    const auto registered = std::make_shared<Registered>(Registered{this, std::move(handler)});
    sd_bus_slot* slot = nullptr;
    checkDone(sd_bus_add_match_async(get(), &slot, rule.c_str(), called, nullptr, registered.get()),
              "cannot listen to " + rule);
    return {slot, registered};
}

Slot Connection::serve(const std::string& path, Handler handler) {
    const auto registered = std::make_shared<Registered>(Registered{this, std::move(handler)});
    sd_bus_slot* slot = nullptr;
    checkDone(sd_bus_add_fallback(get(), &slot, path.c_str(), called, registered.get()),
              "cannot serve " + path);
    return {slot, registered};
}

bool Connection::acquireName(const std::string& name) const {
    const int result = sd_bus_request_name(get(), name.c_str(), 0);
    if (result == -EEXIST || result == -EALREADY) {
        return result == -EALREADY;
    }
    checkDone(result, "the bus does not give the name " + name);
    return result > 0;
}

void Connection::releaseName(const std::string& name) const {
    sd_bus_release_name(get(), name.c_str());
}

int Connection::descriptor() const {
    return sd_bus_get_fd(get());
}

short Connection::events() const {
    return static_cast<short>(sd_bus_get_events(get()));
}

std::optional<std::chrono::steady_clock::time_point> Connection::deadline() const {
    std::uint64_t at = 0;
    if (sd_bus_get_timeout(get(), &at) < 0 || at == std::numeric_limits<std::uint64_t>::max()) {
        return std::nullopt;
    }
    return std::chrono::steady_clock::time_point(Microseconds(at));  // of the same clock
}

void Connection::process() {
    int result = 1;
    while (result > 0) {
        result = sd_bus_process(get(), nullptr);
        checkDone(result, "the bus is gone");
    }
}

bool Connection::isOpen() const {
    return sd_bus_is_open(get()) > 0;
}

int Connection::called(sd_bus_message* message, void* registered, sd_bus_error* /*error*/) {
    const Registered held = *static_cast<Registered*>(registered);  // the handler may end its own slot
    held.connection->handle(held, Message::share(message));
    return 1;
}

void Connection::handle(const Registered& registered, const Message& message) const {
    try {
        registered.handler(message);
        return;
    } catch (const Error& error) {
        answerFailure(message, error);
    } catch (const std::exception& exception) {
        answerFailure(message, Error(kFailed, exception.what()));
    }
}

void Connection::answerFailure(const Message& message, const Error& error) const {
    if (!message.isMethodCall()) {
        if (tell_) {
            tell_(error.what());
        }
    } else if (!message.wantsNoReply()) {
        sd_bus_reply_method_errorf(message.get(), error.name().c_str(), "%s",
                                   shortText(error.what()).c_str());
    }
}

}  // namespace cvagent::bus
