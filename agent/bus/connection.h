#pragma once

#include <systemd/sd-bus.h>

#include <chrono>
#include <cstdint>
#include <functional>
#include <memory>
#include <optional>
#include <string>

#include "agent/bus/message.h"
#include "agent/bus/slot.h"

namespace cvagent::bus {

/// Where a call goes.
struct Target {
    std::string service;
    std::string path;
    std::string interface;
    std::string member;
};

/// A connection to a bus. It belongs to one thread, and so does all that comes from it. Handlers are called
/// while it is processed; an exception that leaves one is answered as an error where a call waits for an
/// answer, and told to onFailure() otherwise.
class Connection {
public:
    using Microseconds = std::chrono::microseconds;
    using Handler = std::function<void(const Message&)>;

    /// @param address "system", or a bus's address ("unix:path=/run/x/bus"). Throws Error.
    explicit Connection(const std::string& address);
    Connection(const Connection&) = delete;
    Connection& operator=(const Connection&) = delete;
    /// What waits to be sent is sent, if that needs no waiting.
    ~Connection();

    sd_bus* get() const { return bus_.get(); }
    /// ":1.23". Waits for the bus's greeting.
    std::string uniqueName() const;

    Message newCall(const Target& target) const;
    Message newSignal(const std::string& path, const std::string& interface, const std::string& member) const;

    /// Sends a call and waits for its answer; never from inside a handler. Throws Error: what the answer
    /// says.
    Message ask(const Message& call, Microseconds longest) const;
    /// Sends a call. The handler gets its answer, be it an error; the bus makes one when the time is over.
    [[nodiscard]] Slot askLater(const Message& call, Microseconds longest, Handler handler);
    /// An answer or a signal. Throws Error.
    void send(const Message& message) const;
    /// How many messages the bus has not taken yet.
    std::uint64_t unsent() const;
    /// Waits until all is sent, or an error. @return whether all is
    bool flush() const;

    /// Signals that a match rule lets pass. It is in force when the answer to the next call has come.
    [[nodiscard]] Slot match(const std::string& rule, Handler handler);
    /// Calls for an object and all below it, but those of org.freedesktop.DBus.Peer.
    /// @param handler answers, now or later
    [[nodiscard]] Slot serve(const std::string& path, Handler handler);
    /// @return whether it is ours now; not when another one has it
    bool acquireName(const std::string& name) const;
    void releaseName(const std::string& name) const;

    // For who waits by himself: what to wait for, and what to do then.
    int descriptor() const;
    /// As poll() has them.
    short events() const;
    /// When process() is due even though nothing comes; nothing for never.
    std::optional<std::chrono::steady_clock::time_point> deadline() const;
    /// Handles what has come. Throws Error when the bus is gone.
    void process();
    bool isOpen() const;

    void onFailure(std::function<void(const std::string&)> tell) { tell_ = std::move(tell); }

private:
    struct Registered;
    static int called(sd_bus_message* message, void* registered, sd_bus_error* error);
    void handle(const Registered& registered, const Message& message) const;
    void answerFailure(const Message& message, const Error& error) const;

    struct Close {
        void operator()(sd_bus* bus) const;
    };
    std::unique_ptr<sd_bus, Close> bus_;
    std::function<void(const std::string&)> tell_;
};

}  // namespace cvagent::bus
