#pragma once

#include <condition_variable>
#include <cstdint>
#include <functional>
#include <memory>
#include <mutex>
#include <optional>
#include <string>
#include <vector>

#include "agent/core/announcer.h"
#include "agent/core/pool.h"
#include "agent/core/problem.h"
#include "agent/core/request.h"

namespace cvagent {

/// What a write came to.
struct WriteResult {
    enum Outcome {
        applied,   ///< the host has the value that was written
        differs,   ///< the host has another value; not every write shows at once
        notKnown,  ///< nothing can be compared, or nobody knows
    };

    Reading before;  ///< of a property that can only be written: nothing was read
    Reading after;   ///< failed when nothing was read, as after a write that failed
    Outcome outcome = notKnown;
    bool complained = false;         ///< the plug-in reported errors of the write, though it took the value
    std::string lacking;             ///< what is not to be seen on the host, for people; "" when nothing is
    std::vector<std::string> notes;  ///< what else has happened on the running host because of it
    std::optional<Problem> problem;  ///< why it failed, or was cut off; nothing when the plug-in took it
};

/// What came of a write on the running host; see WriteResult.
struct EffectInForce {
    std::string lacking;
    std::vector<std::string> notes;
    bool isKept = false;     ///< by a system of the host: the plug-in's files do not count
    bool isForNow = false;   ///< nor do they here: nobody keeps it, and it holds until restart
    bool isInForce = false;  ///< that system has been found to use the value, whatever the plug-in reads
};
/// Brings into the running host what a plug-in only writes to files. Called before a write; what it gives is
/// called behind one that the plug-in took. May give none.
using BringIntoForce = std::function<std::function<EffectInForce()>(
    const IC::MutableNode& node, const Property& row, const IC::PropertyValue& value)>;

/// Writes properties, one at a time: each write reads files of the host, changes them and puts them back, and
/// two at once would lose lines. Reads go on beside it. Any thread.
class Writer {
public:
    /// The tree that is written to.
    struct Tree {
        std::function<void()> refresh;  ///< what to do after each write, before its event is told
        std::function<bool(const Handle&)> lists;
    };

    /// All outlive the writer.
    Writer(Pool& pool, Facts& facts, Announcer& announcer, Tree tree, BringIntoForce bringIntoForce = nullptr)
        : pool_(pool),
          facts_(facts),
          announcer_(announcer),
          tree_(std::move(tree)),
          bringIntoForce_(std::move(bringIntoForce)) {}
    Writer(const Writer&) = delete;
    Writer& operator=(const Writer&) = delete;

    /// @param node kept until the write is done. A write that hangs at its caller's deadline goes on, and no
    ///             other one begins before its end; one that has not begun by then never does. A node
    ///             that was withdrawn before the turn of the write is not written to (notFound).
    /// Throws Problem (busy) when another write is at work until the deadline; without a deadline, when the
    /// other one's caller has given it up, for it may hang for ever.
    WriteResult write(const Handle& node, const Property& row, const IC::PropertyValue& value,
                      const Request& request);

    /// Runs what must not meet a write, on the calling thread, and has the tree refreshed behind it. Throws
    /// Problem (busy) when a write is at work until the request's deadline.
    void between(const Request& request, const std::function<void()>& work);

private:
    struct Job;
    struct Pending;
    class Turn;

    WriteResult perform(const Job& job, const Request& request);
    Reading askSettled(const Job& job);
    void lookAfter(const Job& job, const EffectInForce& effect, WriteResult& result);
    void giveUp(std::uint64_t turn);
    WriteResult timedOut(const IC::MutableNode& node, const Property& row, bool begun);

    Pool& pool_;
    Facts& facts_;
    Announcer& announcer_;
    Tree tree_;
    const BringIntoForce bringIntoForce_;
    std::mutex guard_;  // guards everything below
    std::condition_variable turnOver_;
    bool busy_ = false;
    std::uint64_t turns_ = 0;
    bool givenUp_ = false;  // the write at work is
};

}  // namespace cvagent
