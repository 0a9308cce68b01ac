#pragma once

#include <cstdint>
#include <functional>
#include <map>
#include <optional>
#include <set>
#include <string>
#include <utility>
#include <vector>

#include "agent/bus/connection.h"
#include "agent/service/callers.h"
#include "agent/service/loop.h"

namespace cvagent::service {

/// The bus keeps what was sent to a reader until he reads it. dbus-daemon counts that against the sender,
/// too, of all readers together, and at a limit (127 MiB on a system's bus) it listens to him no more: a few
/// who never read would silence the agent for everybody. So whoever leaves much there while there is much
/// gets no further answer until he has read, and a user of many connections no large one. Signals cannot be
/// withheld from one; near the limit the service has to leave the bus. A bus that does not tell has limits of
/// its own. The loop's thread.
class Unread {
public:
    enum class Answer { whole, refusal, none };
    struct Limit {
        std::uint64_t ofAll;   ///< from so many bytes that wait for all readers on,
        std::uint64_t ofOne;   ///< so many at most may wait for one
        std::uint64_t ofUser;  ///< and so many for all connections of a user
    };
    struct Limits {
        std::vector<Limit> rows;  ///< the highest first
        std::uint64_t full;       ///< so many for all readers are near the bus's own limit
    };
    /// For those that a system's bus has when nobody says otherwise.
    static Limits standardLimits();

    Unread(bus::Connection& connection, Loop& loop, Limits limits = standardLimits())
        : connection_(connection), loop_(loop), limits_(std::move(limits)) {}

    /// @param end called when the bus is about to listen no more
    void whenFull(std::function<void()> end) { full_ = std::move(end); }
    /// What a caller gets now.
    Answer answerFor(const std::string& caller);
    /// What he gets in place of a large answer.
    Answer largeAnswerFor(const Caller& caller);
    /// Whether so little was sent since the bus was asked that a further large answer may go.
    bool isKnown() const;
    /// A signal was sent.
    void signalled() { weigh(1); }

private:
    using Told = std::function<void(std::optional<std::uint64_t> bytes)>;
    using User = std::optional<std::uint32_t>;

    Answer answer(const std::string& caller, const User& user, unsigned int weight);
    void weigh(unsigned int weight);
    void look();
    void ask(const std::string& name, const std::string& figure, const Told& told);
    void takeOwn(std::optional<std::uint64_t> bytes);
    void judge(const std::string& name, const User& user, std::uint64_t unread, const Limit& limit);

    bus::Connection& connection_;
    Loop& loop_;
    const Limits limits_;
    std::function<void()> full_;
    bool untold_ = false;  // the bus does not tell
    unsigned int weight_ = 0;
    std::map<std::string, User> readers_;  // who was answered since the last look, or had not read by then
    std::map<std::string, unsigned int> silent_;  // who reads nothing, with the refusals that he still gets
    std::map<std::uint32_t, std::uint64_t> unreadOf_;  // by user, of the look that is under way
    std::set<std::uint32_t> silentUsers_;
    unsigned int questions_ = 0;  // that are under way
    std::vector<bus::Slot> slots_;
    Loop::Source nextLook_;
};

}  // namespace cvagent::service
