#include "agent/service/calls.h"

#include <algorithm>
#include <array>
#include <iterator>
#include <limits>
#include <utility>

#include "agent/bus/text.h"
#include "agent/core/property_words.h"
#include "agent/service/log.h"
#include "agent/service/members.h"
#include "agent/service/names.h"
#include "agent/service/values.h"

namespace cvagent::service {

namespace {

constexpr std::chrono::seconds kReadTime{20};  // below the 25 s after which most clients give up
constexpr std::size_t kMostEvents = 512;
constexpr std::size_t kMostProperties = 1024;  // of one read
constexpr std::size_t kLongestWord = 16384;    // that may be a path; a call that waits keeps it

/// In the order of Problem::Kind.
constexpr std::array kKindNames = {"NotFound", "Ambiguous", "Refused", "Busy", "TimedOut", "Failed"};

const char* subjectName(Problem::Subject subject) {
    return subject == Problem::node        ? "node"
           : subject == Problem::property  ? "property"
           : subject == Problem::plan      ? "plan"
           : subject == Problem::objection ? "force"
                                           : "";
}

/// The node of an id. Throws Problem.
const NodeView& nodeOf(const PendingCall& call, std::uint32_t id) {
    const NodeView* node = call.parts().model.byId(id);
    if (node == nullptr) {
        throw Problem(Problem::notFound, "there is no node " + std::to_string(id), Problem::node);
    }
    return *node;
}

Withheld withheldFrom(const PendingCall& call, const Caller& caller, Withheld how) {
    return call.parts().consent.isTrusted(caller) ? Withheld::nothing : how;
}

}  // namespace

const char* errorNameOf(const Problem& problem) {
    return kKindNames.at(problem.kind());
}

void comeBack(const CallPointer& call, std::function<void()> work) {
    call->parts().mailbox->post([call, held = std::move(work)] { call->guarded(held); });
}

void submit(const CallPointer& call, Workers& workers, const Caller& caller, Workers::Job job) {
    const auto safely = [call, held = std::move(job)] {
        try {
            held();
        } catch (const Problem& problem) {
            comeBack(call, [call, problem] { call->fail(problem); });
        } catch (const std::exception& exception) {
            const Problem problem(Problem::failed, exception.what());
            comeBack(call, [call, problem] { call->fail(problem); });
        }
    };
    if (!workers.submit(caller.user, safely)) {
        call->fail(bus::kLimitsExceeded, "too many calls wait for an answer already");
    }
}

void PendingCall::answer(const std::function<void(bus::Writer& writer)>& fill) const {
    if (message_.wantsNoReply()) {
        return;
    }
    const bus::Message reply = message_.reply();
    bus::Writer writer(reply);
    fill(writer);
    parts_.connection.send(reply);
}

void PendingCall::fail(const std::string& name, const std::string& text) const {
    if (!message_.wantsNoReply()) {
        parts_.connection.send(message_.errorReply(name, text));
    }
}

void PendingCall::fail(const Problem& problem, const std::vector<std::string>& errors) const {
    if (message_.wantsNoReply()) {
        return;
    }
    const bus::Message reply =
        message_.errorReply(std::string(kErrorPrefix) + errorNameOf(problem), problem.what());
    bus::Writer(reply).put(subjectName(problem.subject())).put(bus::shortText(problem.detail())).put(errors);
    parts_.connection.send(reply);
}

bool PendingCall::goesAs(Unread::Answer answer) const {
    if (answer == Unread::Answer::refusal) {
        fail(bus::kLimitsExceeded, "too much of what was sent to you is not read yet");
    }
    return answer == Unread::Answer::whole;
}

void PendingCall::guarded(const std::function<void()>& work) const {
    try {
        work();
    } catch (const Problem& problem) {
        fail(problem);
    } catch (const bus::Error& error) {
        fail(error.name(), error.what());
    } catch (const std::exception& exception) {
        fail(bus::kFailed, exception.what());
    }
}

void PendingCall::withCaller(std::function<void(const Caller& caller)> next) const {
    const PendingCall held = *this;
    const bool asked =
        parts_.callers.find(message_.sender(), [held, go = std::move(next)](const Caller* caller) {
            if (caller == nullptr) {
                log(Priority::warning, "a call of " + held.message().sender() +
                                           " is denied: the bus does not tell who calls, or he has gone");
                held.fail(bus::kAccessDenied, "the bus does not tell who calls");
            } else {
                held.guarded([&] { go(*caller); });
            }
        });
    if (!asked) {
        fail(bus::kLimitsExceeded, "too many calls wait for an answer already");
    }
}

void PendingCall::inTurn(const std::function<void(const Caller& caller)>& next) const {
    const PendingCall held = *this;
    withCaller([held, next](const Caller& caller) {
        const auto work = [held, next, caller] {
            if (held.goesAs(held.parts_.unread.largeAnswerFor(caller))) {
                held.guarded([&] { next(caller); });
            }
        };
        if (!held.parts_.turns.submit(caller.user, work)) {
            held.fail(bus::kLimitsExceeded, "too many calls wait for an answer already");
        }
    });
}

void answerTree(const CallPointer& call) {
    call->inTurn([call](const Caller& caller) {
        const Withheld withheld = withheldFrom(*call, caller, Withheld::leftOut);
        call->answer([&](bus::Writer& writer) {
            writer.put(call->parts().agent.plugins());
            writer.array("(uuuuosssua(uyvtus))", [&] {
                for (const NodeView* node : call->parts().model.all()) {
                    writer.structure("uuuuosssua(uyvtus)", [&] {
                        putNodeHead(writer, *node);
                        putReadings(writer, node->readings, withheld);
                    });
                }
            });
        });
    });
}

namespace {

std::string takeWord(bus::Reader& arguments) {
    std::string word = arguments.text();
    if (word.size() > kLongestWord) {
        throw Problem(Problem::notFound, "no node has so long a name", Problem::node);
    }
    return word;
}

void putNode(bus::Writer& writer, const NodeView& node) {
    writer.structure("uuuuosssu", [&] { putNodeHead(writer, node); });
}

}  // namespace

void answerFind(const CallPointer& call) {
    bus::Reader arguments(call->message());
    const std::string word = takeWord(arguments);
    call->withCaller([call, word](const Caller& caller) {
        submit(call, call->parts().readers, caller, [call, word] {
            const NodeRef found = call->parts().agent.find(word);
            comeBack(call, [call, id = found->getNodeId()] {
                const NodeView& node = nodeOf(*call, id);
                call->answer([&](bus::Writer& writer) { putNode(writer, node); });
            });
        });
    });
}

namespace {

/// @param after the number that was asked for
void answerEvents(const PendingCall& call, std::uint64_t after, const std::vector<Event>& events,
                  std::uint64_t dropped) {
    const std::uint64_t missing = events.empty() ? 0 : events.front().number - after - 1;
    call.answer([&](bus::Writer& writer) {
        writer.array(kEventType, [&] {
            for (const Event& event : events) {
                putEvent(writer, event);
            }
        });
        writer.put(std::min(dropped, missing));
    });
}

void findEvents(const CallPointer& call, const Caller& caller) {
    const std::uint64_t after = bus::Reader(call->message()).longNumber();
    Subscription::Taken taken = call->parts().agent.subscribe(after)->take();
    const auto count = static_cast<long>(std::min(taken.events.size(), kMostEvents));
    std::vector<Event> events(std::move_iterator(taken.events.begin()),
                              std::move_iterator(taken.events.begin() + count));
    const std::uint64_t upTo =
        events.empty() ? std::numeric_limits<std::int64_t>::max() : events.front().number - 1;
    if (taken.dropped == 0 || !call->parts().past || after >= upTo) {
        answerEvents(*call, after, events, taken.dropped);
        return;
    }
    submit(call, call->parts().readers, caller, [call, after, upTo, events, dropped = taken.dropped] {
        std::vector<Event> all = call->parts().past(after, upTo, kMostEvents);
        const std::size_t more = std::min(events.size(), kMostEvents - std::min(all.size(), kMostEvents));
        all.insert(all.end(), events.begin(), events.begin() + static_cast<long>(more));
        comeBack(call, [call, after, all, dropped] { answerEvents(*call, after, all, dropped); });
    });
}

}  // namespace

/// What the agent itself remembers, and behind that the history.
void answerEventsSince(const CallPointer& call) {
    call->inTurn([call](const Caller& caller) { findEvents(call, caller); });
}

namespace {

struct Told {
    std::vector<Reading> readings;
    std::vector<std::string> errors;  ///< what the plug-in reported on the way
};

/// What the host says; on a worker's thread.
Told askHost(const CallPointer& call, const NodeRef& node, const std::vector<unsigned int>& ids,
             Request::Clock::time_point until) {
    const Request request("a reader on the bus", until);
    Told told{call->parts().agent.read(node, ids, Freshness::anew, request), {}};
    told.errors = request.errors().take().texts;
    return told;
}

void putTold(bus::Writer& writer, const Told& told, Withheld withheld) {
    putReadings(writer, told.readings, withheld);
    writer.put(told.errors);
}

std::vector<std::string> takeNames(bus::Reader& arguments) {
    std::vector<std::string> names = arguments.texts();
    std::size_t size = 0;
    for (const std::string& name : names) {
        size += name.size();
    }
    if (names.size() > kMostProperties || size > kLongestWord) {
        throw bus::Error(bus::kLimitsExceeded, "too many properties in one call");
    }
    return names;
}

}  // namespace

void startRead(const CallPointer& call, std::optional<std::uint32_t> node) {
    bus::Reader arguments(call->message());
    const std::uint32_t id = node ? *node : arguments.number();
    const std::vector<std::uint32_t> wanted = arguments.numbers();
    if (wanted.size() > kMostProperties) {
        throw bus::Error(bus::kLimitsExceeded, "too many properties in one call");
    }
    nodeOf(*call, id);
    call->withCaller([call, id, wanted](const Caller& caller) {
        const NodeRef ref = nodeOf(*call, id).node;
        const Withheld withheld = withheldFrom(*call, caller, Withheld::asMissing);
        const auto until = Request::Clock::now() + kReadTime;
        submit(call, call->parts().readers, caller, [call, id, wanted, ref, withheld, until] {
            const std::vector<unsigned int> ids =
                wanted.empty() ? readableIds(*ref, {})
                               : std::vector<unsigned int>(wanted.begin(), wanted.end());
            comeBack(call, [call, id, withheld, told = askHost(call, ref, ids, until)] {
                call->parts().model.learn(id, told.readings);
                call->answer([&](bus::Writer& writer) { putTold(writer, told, withheld); });
            });
        });
    });
}

void startFindAndRead(const CallPointer& call) {
    bus::Reader arguments(call->message());
    const std::string word = takeWord(arguments);
    const std::vector<std::string> names = takeNames(arguments);
    call->withCaller([call, word, names](const Caller& caller) {
        const Withheld withheld = withheldFrom(*call, caller, Withheld::asMissing);
        const auto until = Request::Clock::now() + kReadTime;
        submit(call, call->parts().readers, caller, [call, word, names, withheld, until] {
            const NodeRef ref = call->parts().agent.find(word);
            const Told told = askHost(call, ref, readableIds(*ref, names), until);
            comeBack(call, [call, id = ref->getNodeId(), withheld, told] {
                const NodeView& node = nodeOf(*call, id);
                call->parts().model.learn(id, told.readings);
                call->answer([&](bus::Writer& writer) {
                    putNode(writer, node);
                    putTold(writer, told, withheld);
                });
            });
        });
    });
}

}  // namespace cvagent::service
