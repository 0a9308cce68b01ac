#pragma once

#include <chrono>
#include <condition_variable>
#include <functional>
#include <map>
#include <mutex>
#include <string>
#include <thread>
#include <utility>

#include "framework/qx/process_tree.h"

namespace cvagent {

/// While it lives, no command that the plug-in has started runs for ever: one that takes longer than the
/// deadline is killed with all it has started, so that whoever waits for its output goes on. The plug-in
/// knows nothing of it. What does not count: the time that this program was stopped or the machine slept.
///
/// A process that a command leaves behind in the background is nobody's child any more and lives on; where it
/// keeps the pipe open, no more is read at the deadline (of what goes to a shell, as long as that runs). One
/// that the kernel holds in the middle of a device's answer dies when the device lets it.
class CommandDeadline {
public:
    /// @param longest how long a command may take; 0 for as long as it likes
    /// @param tell hears of commands that were ended and that nobody had asked for; any thread
    CommandDeadline(std::chrono::duration<double> longest, std::function<void(const std::string&)> tell);
    CommandDeadline(const CommandDeadline&) = delete;
    CommandDeadline& operator=(const CommandDeadline&) = delete;
    ~CommandDeadline();

private:
    using Seconds = std::chrono::duration<double>;

    void watch();
    bool stoppedWithin(Seconds time);
    using Ages = std::map<std::pair<pid_t, QX::ChildProcess>, Seconds>;
    Ages look(const Ages& ages, Seconds step, Seconds interval);
    void end(pid_t thread, pid_t process, const std::function<bool()>& ending);
    Seconds limitOf(pid_t thread) const;

    Seconds longest_;
    std::function<void(const std::string&)> tell_;
    std::mutex guard_;
    std::condition_variable changed_;
    bool stopped_ = false;  // guarded by guard_
    std::thread watcher_;
};

/// Whose commands this thread starts from here to the end of the scope: those of one call into the plug-in,
/// which hears when one of them was killed, or the agent's own. Those of threads without a scope (the start,
/// the monitors) are told to the user as warnings. One a thread at a time.
class CommandScope {
public:
    /// A write may take ten times as long: it brings interfaces up and walks over all of them, and cut off in
    /// its middle it leaves the host half changed.
    /// What the agent itself starts has a deadline of its own.
    enum Kind { read, write, ours };

    explicit CommandScope(Kind kind);
    CommandScope(const CommandScope&) = delete;
    CommandScope& operator=(const CommandScope&) = delete;
    ~CommandScope();

    /// Whether the calling thread is in a write.
    static bool isWriting();
    /// "timed out after 10 s: ethtool eth0" of the first command that was killed; empty when none was.
    std::string complaint() const;

private:
    friend class CommandDeadline;

    Kind kind_;
    pid_t thread_;
    std::string complaint_;  // guarded by the list of scopes
};

}  // namespace cvagent
