#pragma once

#include <systemd/sd-bus.h>

#include <memory>
#include <string>

#include "agent/bus/error.h"

namespace cvagent::bus {

/// A message, shared like a std::shared_ptr. Messages belong to the thread of their connection.
class Message {
public:
    Message() = default;
    /// Takes over a reference that the library has given.
    static Message adopt(sd_bus_message* message);
    /// Adds one of our own.
    static Message share(sd_bus_message* message);

    sd_bus_message* get() const { return message_.get(); }
    explicit operator bool() const { return message_ != nullptr; }

    // "" where the message has none.
    std::string sender() const;
    std::string path() const;
    std::string interface() const;
    std::string member() const;
    std::string signature() const;

    bool isMethodCall() const;
    bool isError() const;
    /// What an answer that is an error says.
    Error error() const;
    /// Whether the caller does without an answer.
    bool wantsNoReply() const;
    /// Whether its sender lets the user be asked meanwhile.
    bool allowsInteraction() const;
    void allowInteraction();
    /// A call that starts nobody who would have the name.
    void startNobody();

    /// The answer to this call, to be filled. Throws Error.
    Message reply() const;
    Message errorReply(const std::string& name, const std::string& text) const;

private:
    std::shared_ptr<sd_bus_message> message_;
};

}  // namespace cvagent::bus
