// The method Apply: judged, consented to, checked, tried out, made, looked at, told.
#include <malloc.h>
#include <unistd.h>

#include <algorithm>

#include "agent/change/revocable.h"
#include "agent/service/change_request.h"
#include "agent/service/log.h"
#include "agent/service/users.h"
#include "agent/service/values.h"

namespace cvagent::service {

namespace {

constexpr const char* kOutcomeType = "(uu(uyvtus)(uyvtus)ssbssas)";

struct Application {
    Caller caller;
    std::vector<change::MeantChange> changes;
    ApplyWishes wishes;
};

/// What an application has come to.
struct Applied {
    std::vector<change::Outcome> outcomes;
    std::vector<std::string> told;
    std::vector<std::string> errors;
};

Audience writersOf(const std::vector<change::MeantChange>& changes) {
    const bool stops = std::ranges::any_of(
        changes, [](const change::MeantChange& change) { return change.drastic() != nullptr; });
    return stops ? Audience::stoppers : Audience::writers;
}

void noteOutcomes(const Application& application, const std::vector<change::Outcome>& outcomes) {
    const std::string who = userText(application.caller.user);
    for (std::size_t i = 0; i < outcomes.size(); ++i) {
        const change::Outcome& outcome = outcomes[i];
        if (outcome.kind == change::Outcome::unchanged || outcome.kind == change::Outcome::notMade) {
            continue;
        }
        const change::MeantChange& change = application.changes[i];
        const bool isUnknown = outcome.kind == change::Outcome::notKnown;
        const std::string verdict = isUnknown ? "unknown" : change::verdictName(outcome.kind);
        noteWrite(Priority::notice, {change.node->getPath(), change.row->name, application.caller.user},
                  who + " wrote " + change.target() + ": " + verdict +
                      (outcome.reason.empty() ? "" : ": " + outcome.reason),
                  verdict);
    }
}

change::RevocableSettings revocableSettings(const ApplyWishes& wishes, const std::string& who,
                                            const std::function<void(const std::string& text)>& tell) {
    if (geteuid() != 0 && wishes.confirmSeconds && !wishes.unguarded) {
        throw Problem(Problem::refused,
                      "the service is not root's and takes no change back; nothing was done");
    }
    const bool keepsHalf = wishes.force || wishes.plain;
    return {who, wishes.confirmSeconds, wishes.unguarded, keepsHalf, 0, tell, nullptr};
}

Applied applied(const PendingCall& call, const Application& application) {
    const std::string who = userText(application.caller.user);
    const auto request = [&who](const std::string& plan) {
        return Request(who, Request::Clock::now() + kWriteTime, plan);
    };
    AgentHost host(call.parts().agent);
    Applied done;
    change::ApplySettings settings;
    settings.rehearsal = call.parts().rehearsal;
    settings.goesOn = settings.rehearsal.goesOn;
    settings.triesOut = !application.wishes.plain || application.wishes.confirmSeconds;
    settings.force = application.wishes.force;
    settings.verifySeconds = application.wishes.verifySeconds;
    settings.request = request;
    settings.tell = [&done](const std::string& text) { done.told.push_back(text); };
    change::Revocable revocable(revocableSettings(application.wishes, who, settings.tell));
    settings.safeguard = &revocable;
    const auto already = application.wishes.plain ? change::Already::made : change::Already::leftOut;
    done.outcomes =
        change::apply(host, change::propose(host, application.changes, request(""), already), settings);
    done.errors = host.errors();
    return done;
}

void putOutcome(bus::Writer& writer, const change::MeantChange& change, const change::Outcome& outcome) {
    writer.structure("uu(uyvtus)(uyvtus)ssbssas", [&] {
        writer.put(std::uint32_t{change.node->getNodeId()}).put(std::uint32_t{change.row->id});
        putReading(writer, outcome.before);
        putReading(writer, outcome.after);
        writer.put(change::verdictName(outcome.kind)).put(outcome.reason).put(outcome.complained);
        writer.put(outcome.lacking).put(outcome.problem ? errorNameOf(*outcome.problem) : "");
        writer.put(outcome.notes);
    });
}

void answerApply(const PendingCall& call, const Application& application, const Applied& done) {
    for (std::size_t i = 0; i < done.outcomes.size(); ++i) {
        if (!done.outcomes[i].after.failed()) {
            call.parts().model.learn(application.changes[i].node->getNodeId(), {done.outcomes[i].after});
        }
    }
    call.answer([&](bus::Writer& writer) {
        writer.array(kOutcomeType, [&] {
            for (std::size_t i = 0; i < done.outcomes.size(); ++i) {
                putOutcome(writer, application.changes[i], done.outcomes[i]);
            }
        });
        writer.put(done.told).put(done.errors);
    });
}

/// On the thread of the writes, one behind the other: no other change comes between.
void perform(const CallPointer& call, const Application& application) {
    const auto done = std::make_shared<const Applied>(applied(*call, application));
    noteOutcomes(application, done->outcomes);
    comeBack(call, [call, application, done] { answerApply(*call, application, *done); });
    malloc_trim(0);  // the plan was large
}

}  // namespace

void startApply(const CallPointer& call) {
    bus::Reader arguments(call->message());
    const std::vector<change::NamedChange> named = takeChanges(arguments);
    const ApplyWishes wishes = takeWishes(arguments);
    ifAllowed(call, named, {writersOf, "apply"},
              [call, wishes](const Caller& caller, const std::vector<change::MeantChange>& changes) {
                  const Application application{caller, changes, wishes};
                  submit(call, call->parts().writers, caller,
                         [call, application] { perform(call, application); });
              });
}

}  // namespace cvagent::service
