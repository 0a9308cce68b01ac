#pragma once

#include <chrono>
#include <optional>
#include <string>

namespace cvagent::service {

/// The system's service manager, where it has started this process: what NOTIFY_SOCKET and WATCHDOG_USEC
/// say. To be made before the environment is reduced; the commands of plug-ins hear nothing of it.
class Manager {
public:
    Manager();

    bool isThere() const { return !socket_.empty(); }
    void ready() const { tell("READY=1"); }
    /// What the service does now, for people.
    void status(const std::string& text) const { tell("STATUS=" + text); }
    void reloading() const;
    void stopping() const { tell("STOPPING=1"); }
    void alive() const { tell("WATCHDOG=1"); }
    /// How often alive() is due; nothing when nobody wants to hear it.
    std::optional<std::chrono::microseconds> watchdogInterval() const { return watchdog_; }

private:
    void tell(const std::string& state) const;

    std::string socket_;
    std::optional<std::chrono::microseconds> watchdog_;
};

}  // namespace cvagent::service
