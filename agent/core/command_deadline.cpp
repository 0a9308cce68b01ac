#include "agent/core/command_deadline.h"

#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <fstream>
#include <sstream>
#include <system_error>
#include <vector>

#include "agent/core/threads.h"
#include "agent/core/want.h"
#include "agent/shell/child.h"

namespace cvagent {

namespace {

using Seconds = std::chrono::duration<double>;

constexpr int kWritePatience = 10;  // times as long as a read
constexpr int kLooks = 8;           // a deadline, but at least one a second
constexpr Seconds kSlowestLook{1};
constexpr Seconds kFastestLook{0.01};
constexpr unsigned long long kRead = 0;  // no process started then: the reading of one has an age of its own

/// The calls into the plug-in that are under way, by their threads.
struct CommandScopes {
    std::mutex guard;
    std::map<pid_t, CommandScope*> all;  // guarded by guard
};

CommandScopes& scopes() {
    static CommandScopes list;
    return list;
}

std::string secondsText(Seconds time) {
    std::ostringstream text;
    text << time.count() << " s";
    return text.str();
}

/// The command as its author wrote it: the text that the shell was given.
std::string commandText(pid_t process) {
    if (std::string command = shell::commandOf(process); !command.empty()) {
        return command;
    }
    std::ifstream in("/proc/" + std::to_string(process) + "/cmdline");
    std::string text;
    std::vector<std::string> words;
    for (std::string word; std::getline(in, word, '\0');) {
        text += (words.empty() ? "" : " ") + word;
        words.push_back(word);
    }
    return words.size() > 2 && words[1] == "-c" ? words.back() : text;
}

}  // namespace

CommandDeadline::CommandDeadline(Seconds longest, std::function<void(const std::string&)> tell)
    : longest_(longest), tell_(std::move(tell)) {
    if (longest_ <= Seconds::zero()) {
        return;
    }
    try {
        watcher_ = std::thread([this] { watch(); });
    } catch (const std::system_error&) {
        tell_("the system gives no more threads: commands that hang are waited for");
        noteWant(EAGAIN);
    }
}

CommandDeadline::~CommandDeadline() {
    {
        const std::lock_guard lock(guard_);
        stopped_ = true;
    }
    changed_.notify_all();
    if (watcher_.joinable()) {
        watcher_.join();
    }
}

bool CommandDeadline::stoppedWithin(Seconds time) {
    std::unique_lock lock(guard_);
    return changed_.wait_for(lock, time, [this] { return stopped_; });
}

/// A command's time is counted from look to look, and a look that comes late counts as one: while this
/// program did not run, its commands may not have run either.
void CommandDeadline::watch() {
    const Seconds interval = std::clamp(longest_ / kLooks, kFastestLook, kSlowestLook);
    Ages ages;
    for (auto last = std::chrono::steady_clock::now(); !stoppedWithin(interval);) {
        const auto now = std::chrono::steady_clock::now();
        const Seconds step = std::min(Seconds(now - last), 2 * interval);
        last = now;
        ages = look(ages, step, interval);
    }
}

/// @return the ages of the commands that run now
CommandDeadline::Ages CommandDeadline::look(const Ages& ages, Seconds step, Seconds interval) {
    Ages present;
    const auto ageOf = [&](pid_t thread, const QX::ChildProcess& command) -> Seconds& {
        const auto known = ages.find({thread, command});
        return present[{thread, command}] = known == ages.end() ? Seconds::zero() : known->second + step;
    };
    for (const pid_t thread : ownThreads()) {
        const Seconds limit = limitOf(thread);
        for (const QX::ChildProcess& command : commandsOf(thread)) {
            if (Seconds& age = ageOf(thread, command); age >= limit) {
                end(thread, command.id, [&] { return QX::killChild(thread, command); });
                age = Seconds::zero();
            }
        }
        // A process that has ended, or been killed by now, may have left others behind that keep its pipe
        // open.
        for (const pid_t process : shell::readBy(thread)) {
            if (ageOf(thread, {process, kRead}) >= limit + interval) {
                end(thread, process, [process] { return shell::cutOff(process); });
            }
        }
    }
    return present;
}

Seconds CommandDeadline::limitOf(pid_t thread) const {
    const std::lock_guard lock(scopes().guard);
    const auto scope = scopes().all.find(thread);
    if (scope == scopes().all.end()) {
        return longest_;
    }
    switch (scope->second->kind_) {
        case CommandScope::write:
            return longest_ * kWritePatience;
        case CommandScope::ours:
            return Seconds::max();
        case CommandScope::read:
            break;
    }
    return longest_;
}

/// The call that waits for the command goes on only after it has been told why. Who is told otherwise may
/// call into the plug-in.
void CommandDeadline::end(pid_t thread, pid_t process, const std::function<bool()>& ending) {
    const Seconds limit = limitOf(thread);
    std::string text;
    {
        const std::lock_guard lock(scopes().guard);
        text = commandText(process);
        if (!ending()) {
            return;
        }
        if (const auto scope = scopes().all.find(thread); scope != scopes().all.end()) {
            std::string& complaint = scope->second->complaint_;
            complaint = complaint.empty() ? "timed out after " + secondsText(limit) + ": " + text : complaint;
            return;
        }
    }
    tell_("a command of the plug-in was ended after " + secondsText(limit) +
          "; what it would have told is missing: " + text);
}

CommandScope::CommandScope(Kind kind) : kind_(kind), thread_(gettid()) {
    const std::lock_guard lock(scopes().guard);
    scopes().all[thread_] = this;
}

CommandScope::~CommandScope() {
    const std::lock_guard lock(scopes().guard);
    scopes().all.erase(thread_);
}

bool CommandScope::isWriting() {
    const std::lock_guard lock(scopes().guard);
    const auto own = scopes().all.find(gettid());
    return own != scopes().all.end() && own->second->kind_ == write;
}

std::string CommandScope::complaint() const {
    const std::lock_guard lock(scopes().guard);
    return complaint_;
}

}  // namespace cvagent
