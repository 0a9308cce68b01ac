#pragma once

#include <chrono>
#include <functional>
#include <set>
#include <string>
#include <thread>

namespace hardware {

/// Hears the kernel's news of devices and links, and tells which subsystem to look at again: once for many
/// news that come together, and everything when the kernel had to drop some or nothing was heard for long.
class Watcher {
public:
    using Changed = std::function<void(const std::string& subsystem)>;

    /// Where the news come from: sockets, which the watcher closes; -1 for none.
    struct News {
        int devices;  ///< the kernel's device news (uevents)
        int links;    ///< news of links (rtnetlink)
    };
    struct Times {
        std::chrono::milliseconds quiet{200};     ///< so long without news, and they are told ...
        std::chrono::milliseconds longest{1000};  ///< ... or so long after the first, whatever comes
        std::chrono::milliseconds everything{
            std::chrono::minutes(5)};  ///< a look at everything, without news
    };

    /// @param changed gets the subsystem, "" for everything; called on the watcher's thread. While news keep
    /// coming it is called for no more than half of the time.
    explicit Watcher(Changed changed);
    Watcher(Changed changed, News news, Times times);
    Watcher(const Watcher&) = delete;
    Watcher& operator=(const Watcher&) = delete;
    /// Waits for a call of `changed` that is under way.
    ~Watcher();

    /// The news of this host's kernel.
    static News kernelNews();
    /// The subsystem that a message of the kernel's device news names; "" for none.
    static std::string subsystemOf(const std::string& message);

private:
    using Time = std::chrono::steady_clock::time_point;

    void watch();
    int waitMilliseconds() const;
    void tell();

    const Changed changed_;
    const News news_;
    const Times times_;
    int end_;
    // The rest is the thread's own.
    std::set<std::string> concerned_;
    Time first_;  // of the news that are not told yet, when the first came ...
    Time last_;   // ... and the last
    Time told_;   // when `changed` has returned ...
    std::chrono::steady_clock::duration took_{};  // ... and how long it took
    Time everything_;                             // when everything was told last
    std::thread thread_;
};

}  // namespace hardware
