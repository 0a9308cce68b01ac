#include "agent/core/writer.h"

#include <array>
#include <chrono>
#include <thread>

#include "agent/core/command_deadline.h"

namespace cvagent {

namespace {

constexpr unsigned int kWrites = 0;  // the pool's lane; no node has this id

IC::Error callSetProperty(IC::MutableNode& node, unsigned int id, const IC::PropertyValue& value) {
    try {
        return node.setProperty(id, value);
    } catch (const std::exception& exception) {
        return {IC::Error::failure, IC::Number(), std::string("the plug-in threw: ") + exception.what()};
    } catch (...) {
        return {IC::Error::failure, IC::Number(), "the plug-in threw an unknown exception"};
    }
}

std::optional<Problem> setGuarded(IC::MutableNode& node, const Property& row,
                                  const IC::PropertyValue& value) {
    const CommandScope scope(CommandScope::write);
    const IC::Error result = callSetProperty(node, row.id, value);
    if (const std::string complaint = scope.complaint(); !complaint.empty()) {
        return Problem(Problem::timedOut,
                       std::string(row.name) + " may be changed only in part: " + complaint);
    }
    if (result.getStatus() != 0) {
        return Problem(Problem::failed, std::string(row.name) + " was not changed: " + errorText(result));
    }
    return std::nullopt;
}

/// A code that was written is an order, the one that is read a state: only equal ones tell something.
WriteResult::Outcome compare(const Property& row, const IC::PropertyValue& written, const Reading& after) {
    if (after.failed() || after.value.kind() != written.kind()) {
        return WriteResult::notKnown;
    }
    if (static_cast<std::string>(after.value) == static_cast<std::string>(written)) {
        return WriteResult::applied;
    }
    return row.labels.empty() ? WriteResult::differs : WriteResult::notKnown;
}

/// What the catalogue knows to be seen of the value and is not.
std::string lackingEffect(const IC::MutableNode& node, const Property& row, const IC::PropertyValue& written,
                          const Reading& after) {
    const Effect* effect = findEffect(row);
    return effect == nullptr ? "" : effect->lacking({node, written, after.failed() ? nullptr : &after.value});
}

std::string joined(const std::string& first, const std::string& second) {
    return first + (first.empty() || second.empty() ? "" : ", and ") + second;
}

/// Why nothing is known of the property after its write, when it was not read.
const char* afterUnread(const WriteResult& result, bool refused) {
    return refused ? "not asked" : result.problem ? "cut off" : "can only be written";
}

/// The write's verdict as its event has it.
std::string verdictOf(const WriteResult& result, bool refused) {
    if (result.problem) {
        return (refused ? "failed: " : "unknown: ") + std::string(result.problem->what());
    }
    if (!result.lacking.empty()) {
        return "differs: " + result.lacking;
    }
    static constexpr std::array kWords = {"applied", "differs", "unknown"};
    std::string text = kWords.at(result.outcome);
    text += result.complained ? ": the plug-in reported errors" : "";
    for (const std::string& note : result.notes) {
        text += (text.find(':') == std::string::npos ? ": " : "; ") + note;
    }
    return text;
}

}  // namespace

struct Writer::Job {
    Handle node;
    const Property& row;
    IC::PropertyValue value;
};

/// The right to write; given back with the object, on whichever thread that is.
class Writer::Turn {
public:
    Turn(Writer& writer, Request::Clock::time_point deadline) : writer_(writer) {
        std::unique_lock lock(writer_.guard_);
        if (deadline == Request::Clock::time_point::max()) {
            writer_.turnOver_.wait(lock, [&] { return !writer_.busy_ || writer_.givenUp_; });
        } else {
            writer_.turnOver_.wait_until(lock, deadline, [&] { return !writer_.busy_; });
        }
        if (writer_.busy_) {
            throw Problem(Problem::busy, "another write is at work");
        }
        writer_.busy_ = true;
        number_ = ++writer_.turns_;
    }
    Turn(const Turn&) = delete;
    Turn& operator=(const Turn&) = delete;
    ~Turn() {
        const std::lock_guard lock(writer_.guard_);
        writer_.busy_ = false;
        writer_.givenUp_ = false;
        writer_.turnOver_.notify_one();
    }

    std::uint64_t number() const { return number_; }

private:
    Writer& writer_;
    std::uint64_t number_ = 0;
};

/// Where the result of a write goes, whether somebody still waits for it or not.
struct Writer::Pending {
    std::mutex guard;  // guards everything below
    std::condition_variable come;
    bool begun = false;
    bool givenUp = false;
    std::optional<WriteResult> result;

    /// @return false when nobody wants it any more
    bool begin() {
        const std::lock_guard lock(guard);
        begun = !givenUp;
        return begun;
    }
};

WriteResult Writer::write(const Handle& node, const Property& row, const IC::PropertyValue& value,
                          const Request& request) {
    if (request.deadline() <= Request::Clock::now()) {
        return timedOut(*node, row, false);
    }
    auto turn = std::make_shared<Turn>(*this, request.deadline());
    const std::uint64_t number = turn->number();
    const auto pending = std::make_shared<Pending>();
    pool_.submit(kWrites, pending.get(),
                 [job = Job{node, row, value}, turn = std::move(turn), pending, request, this]() mutable {
                     if (!pending->begin()) {
                         return;
                     }
                     WriteResult result = perform(job, request);
                     turn.reset();
                     job.node.reset();  // as in a read
                     const std::lock_guard lock(pending->guard);
                     pending->result = std::move(result);
                     pending->come.notify_one();
                 });
    std::unique_lock lock(pending->guard);
    if (pool_.wait(pending->come, lock, request.deadline(),
                   [&pending] { return pending->result.has_value(); })) {
        return *std::move(pending->result);
    }
    pending->givenUp = true;
    const bool begun = pending->begun;
    if (begun) {
        giveUp(number);
    }
    lock.unlock();
    pool_.giveUp(pending.get());
    return timedOut(*node, row, begun);
}

void Writer::between(const Request& request, const std::function<void()>& work) {
    const Turn turn(*this, request.deadline());
    const ErrorScope errors(request.errors());
    const CommandScope scope(CommandScope::write);
    work();
    tree_.refresh();
}

void Writer::giveUp(std::uint64_t turn) {
    const std::lock_guard lock(guard_);
    givenUp_ = givenUp_ || (busy_ && turn == turns_);  // it may have ended just now, and another one begun
    turnOver_.notify_all();
}

WriteResult Writer::timedOut(const IC::MutableNode& node, const Property& row, bool begun) {
    const char* const came = begun ? " may be changed later or in part" : " was not changed";
    const auto doubtful = begun ? Facts::Clock::now() : Facts::Clock::time_point::min();
    WriteResult result;
    result.before = result.after = facts_.overdue(node, row.id, doubtful);
    result.problem = Problem(Problem::timedOut, row.name + std::string(came) + ": no answer in time");
    return result;
}

/// A system that keeps the interface is told to set it up, and does so a moment later.
Reading Writer::askSettled(const Job& job) {
    constexpr std::chrono::seconds kLongest{2};
    constexpr std::chrono::milliseconds kBetweenLooks{50};
    const auto end = std::chrono::steady_clock::now() + kLongest;
    Reading after = facts_.ask(*job.node, job.row.id);
    while (compare(job.row, job.value, after) == WriteResult::differs &&
           std::chrono::steady_clock::now() < end) {
        std::this_thread::sleep_for(kBetweenLooks);
        after = facts_.ask(*job.node, job.row.id);
    }
    return after;
}

void Writer::lookAfter(const Job& job, const EffectInForce& effect, WriteResult& result) {
    const bool isAwaited = effect.isKept && !effect.isInForce;
    result.after = isAwaited ? askSettled(job) : facts_.ask(*job.node, job.row.id);
    result.outcome = effect.isInForce ? WriteResult::applied : compare(job.row, job.value, result.after);
    std::string lacking;
    if (!effect.isKept && !effect.isForNow) {
        lacking = lackingEffect(*job.node, job.row, job.value, result.after);
    } else if (effect.isKept && result.outcome == WriteResult::differs) {
        lacking = "it is kept for the next start, but the host has another value now";
    }
    result.lacking = joined(lacking, effect.lacking);
}

WriteResult Writer::perform(const Job& job, const Request& request) {
    const ErrorScope scope(request.errors());
    const Property& row = job.row;
    WriteResult result;
    result.before = {row.id, &row, {}, "not asked"};
    if (!tree_.lists(job.node)) {
        result.after = result.before;
        result.problem =
            Problem(Problem::notFound, row.name + std::string(" was not changed: the node is gone"));
        return result;
    }
    if (row.readable) {
        result.before = facts_.ask(*job.node, row.id);
    }
    const auto inForce = bringIntoForce_ ? bringIntoForce_(*job.node, row, job.value) : nullptr;
    const std::size_t errorsBefore = request.errors().count();
    result.problem = setGuarded(*job.node, row, job.value);
    result.complained = request.errors().count() > errorsBefore;
    EffectInForce effect = inForce && !result.problem ? inForce() : EffectInForce();
    tree_.refresh();
    const bool refused = result.problem && result.problem->kind() == Problem::failed;
    result.after = {row.id, &row, {}, afterUnread(result, refused)};
    if (!result.problem && row.readable) {
        lookAfter(job, effect, result);
        result.notes = std::move(effect.notes);
    }
    announcer_.announceWrite(
        *job.node, {result.before, result.after, request.caller(), static_cast<std::string>(job.value),
                    verdictOf(result, refused), request.plan(), refused});
    return result;
}

}  // namespace cvagent
