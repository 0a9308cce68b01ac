#pragma once

#include <cstdint>
#include <functional>
#include <map>
#include <optional>
#include <set>
#include <string>
#include <vector>

#include "agent/bus/connection.h"
#include "agent/service/loop.h"

namespace cvagent::service {

/// The bus keeps what was sent to a reader until he reads it. dbus-daemon counts that against the sender,
/// too, of all readers together, and at a limit (127 MiB on a system's bus) it listens to him no more: a few
/// who never read would silence the agent for everybody. So whoever leaves much there while there is much
/// gets no further answer until he has read. A bus that does not tell has limits of its own. The loop's
/// thread.
class Unread {
public:
    enum class Answer { whole, refusal, none };

    Unread(bus::Connection& connection, Loop& loop) : connection_(connection), loop_(loop) {}

    /// What a caller gets now.
    /// @param weight of the answer; 1 for a small one
    Answer answerFor(const std::string& caller, unsigned int weight = 1);

private:
    using Told = std::function<void(std::optional<std::uint64_t> bytes)>;

    void look();
    void ask(const std::string& name, const std::string& figure, const Told& told);
    void takeOwn(std::optional<std::uint64_t> bytes);
    void judge(const std::string& name, bool readsNothing);

    bus::Connection& connection_;
    Loop& loop_;
    bool untold_ = false;  // the bus does not tell
    unsigned int weight_ = 0;
    std::set<std::string> recent_;                // who was answered since the last look
    std::map<std::string, unsigned int> silent_;  // who reads nothing, with the refusals that he still gets
    unsigned int questions_ = 0;                  // that are under way
    std::vector<bus::Slot> slots_;
    Loop::Source nextLook_;
};

}  // namespace cvagent::service
