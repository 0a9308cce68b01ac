#pragma once

#include <functional>
#include <string>
#include <thread>

namespace hardware {

/// Hears the kernel's news of devices and links, and tells which subsystem to look at again: once for many
/// news that come together, and everything when the kernel had to drop some.
class Watcher {
public:
    /// @param changed gets the subsystem, "" for everything; called on the watcher's thread
    explicit Watcher(std::function<void(const std::string& subsystem)> changed);
    Watcher(const Watcher&) = delete;
    Watcher& operator=(const Watcher&) = delete;
    /// Waits for a call of `changed` that is under way.
    ~Watcher();

    /// The subsystem that a message of the kernel's device news names; "" for none.
    static std::string subsystemOf(const std::string& message);

private:
    void watch() const;

    std::function<void(const std::string&)> changed_;
    int devices_ = -1;  // kernel's device news
    int links_ = -1;    // news of links
    int end_ = -1;
    std::thread thread_;
};

}  // namespace hardware
