// The methods Confirm, Lengthen and Rollback: what becomes of changes that were made.
#include <cmath>

#include "agent/service/change_request.h"
#include "agent/service/log.h"
#include "agent/service/users.h"
#include "agent/undo/making.h"

namespace cvagent::service {

namespace {

using undo::ChangeDirectory;
using undo::kChangesPlace;

constexpr double kThousand = 1000;

using Undo = std::function<void(const Caller& caller)>;

ChangeDirectory changeNumbered(std::uint32_t number) {
    try {
        return {kChangesPlace, number};
    } catch (const undo::ChangeError& error) {
        throw Problem(Problem::notFound, error.what());
    }
}

void noteDone(const Caller& caller, const std::string& what) {
    log(Priority::notice, userText(caller.user) + " " + what,
        {{"CORVISTA_CALLER_UID", std::to_string(caller.user)}});
}

void refuse(const Caller& caller, const std::string& deed, const std::string& reason) {
    const std::string user = std::to_string(caller.user);
    log(Priority::warning, "uid " + user + " may not " + deed + ": " + reason,
        {{"CORVISTA_CALLER_UID", user}});
    throw bus::Error(bus::kAccessDenied, "you may not " + deed + ": " + reason);
}

/// @param deed "confirm change 7"
void ifAllowed(const CallPointer& call, Workers& workers, const std::string& deed, const Undo& work) {
    call->withCaller([call, &workers, deed, work](const Caller& caller) {
        const Consent::Question asked{Audience::keepers, deed, call->message().allowsInteraction()};
        call->parts().consent.ask(
            caller, asked, [call, &workers, deed, work, caller](bool allowed, const std::string& reason) {
                call->guarded([&] {
                    if (!allowed) {
                        refuse(caller, deed, reason);
                    }
                    submit(call, workers, caller, [work, caller] { work(caller); });
                });
            });
    });
}

void answerNothing(const CallPointer& call) {
    comeBack(call, [call] { call->answer([](bus::Writer&) {}); });
}

std::string changeText(std::uint32_t number) {
    return number == 0 ? "the last change" : "change " + std::to_string(number);
}

unsigned lastChange() {
    const auto last = undo::lastStanding(kChangesPlace);
    if (!last) {
        throw Problem(Problem::notFound, "there is no change that could be taken back");
    }
    return *last;
}

}  // namespace

void startConfirm(const CallPointer& call) {
    const std::uint32_t number = bus::Reader(call->message()).number();
    const std::string what = changeText(number);
    ifAllowed(call, call->parts().confirmers, "confirm " + what, [call, number, what](const Caller& caller) {
        undo::confirmChange(changeNumbered(number));
        noteDone(caller, "confirmed " + what);
        answerNothing(call);
    });
}

void startLengthen(const CallPointer& call) {
    bus::Reader arguments(call->message());
    const std::uint32_t number = arguments.number();
    const double seconds = arguments.real();
    judgeSeconds(seconds, "the time", kLongestConfirmation);
    const std::string what = changeText(number);
    ifAllowed(call, call->parts().confirmers, "give more time to " + what,
              [call, number, seconds, what](const Caller& caller) {
                  const auto milliseconds = static_cast<std::uint64_t>(std::ceil(seconds * kThousand));
                  undo::lengthenChange(changeNumbered(number), milliseconds);
                  noteDone(caller, "gave " + what + " " + std::to_string(std::lround(seconds)) + " seconds");
                  answerNothing(call);
              });
}

/// In the order of the writes: what is under way comes to its end first.
void startRollback(const CallPointer& call) {
    const std::uint32_t asked = bus::Reader(call->message()).number();
    ifAllowed(
        call, call->parts().writers, "take back " + changeText(asked), [call, asked](const Caller& caller) {
            const std::uint32_t number = asked == 0 ? lastChange() : asked;
            const undo::Journal journal = undo::rollBack(kChangesPlace, changeNumbered(number));
            noteDone(caller, "took back " + changeText(number) + ": it " + undo::stageText(journal.stage));
            comeBack(call, [call, number, journal] {
                call->answer([&](bus::Writer& writer) {
                    writer.put(number).put(undo::stageText(journal.stage)).put(journal.notes);
                });
            });
        });
}

}  // namespace cvagent::service
