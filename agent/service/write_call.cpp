// The method Write: judged, consented to, done, told.
#include <array>
#include <utility>

#include "agent/change/revocable.h"
#include "agent/core/property_words.h"
#include "agent/service/change_request.h"
#include "agent/service/log.h"
#include "agent/service/names.h"
#include "agent/service/users.h"
#include "agent/service/values.h"

namespace cvagent::service {

namespace {

/// In the order of WriteResult::Outcome.
constexpr std::array kVerdicts = {"applied", "differs", "unknown"};

struct Wish {
    change::MeantChange change;
    Caller caller;

    Deed deed() const { return {change.node->getPath(), change.row->name, caller.user}; }
};

void answerWrite(const PendingCall& call, const WriteResult& result, const std::vector<std::string>& errors) {
    if (result.problem) {
        call.fail(*result.problem, errors);
        return;
    }
    call.answer([&](bus::Writer& writer) {
        putReading(writer, result.before);
        putReading(writer, result.after);
        writer.put(kVerdicts.at(result.outcome)).put(result.complained).put(result.lacking).put(errors);
    });
}

/// On a thread of its own, since a host can take its time.
void perform(const CallPointer& call, const Wish& wish, Request::Clock::time_point until) {
    const std::string who = userText(wish.caller.user);
    const Request request(who, until);
    AgentHost host(call->parts().agent);
    change::RevocableSettings settings;
    settings.caller = who;
    settings.tell = [&wish](const std::string& text) {
        log(Priority::warning, wish.change.target() + ": " + text,
            {{"CORVISTA_CALLER_UID", std::to_string(wish.caller.user)}});
    };
    const WriteResult result = change::writeRevocably(host, wish.change, request, settings);
    const std::vector<std::string> errors = request.errors().take().texts;
    const char* verdict = result.problem ? "failed" : kVerdicts.at(result.outcome);
    noteWrite(
        Priority::notice, wish.deed(),
        who + " wrote " + wish.change.target() + ": " + (result.problem ? result.problem->what() : verdict),
        verdict);
    comeBack(call, [call, result, errors, id = wish.change.node->getNodeId()] {
        if (!result.after.failed()) {
            call->parts().model.learn(id, {result.after});
        }
        answerWrite(*call, result, errors);
    });
}

void decide(const CallPointer& call, const Wish& wish) {
    const bool stops = wish.change.drastic() != nullptr;
    const Consent::Question question{stops ? Audience::stoppers : Audience::writers,
                                     "write " + wish.change.target(), call->message().allowsInteraction()};
    call->parts().consent.ask(wish.caller, question, [call, wish](bool allowed, const std::string& reason) {
        call->guarded([&] {
            if (!allowed) {
                noteWrite(Priority::warning, wish.deed(),
                          "uid " + std::to_string(wish.caller.user) + " may not write " +
                              wish.change.target() + ": " + reason,
                          "denied");
                throw bus::Error(bus::kAccessDenied, "you may not write this: " + reason);
            }
            const auto until = Request::Clock::now() + kWriteTime;
            submit(call, call->parts().writers, wish.caller,
                   [call, wish, until] { perform(call, wish, until); });
        });
    });
}

}  // namespace

void startWrite(const CallPointer& call, std::optional<std::uint32_t> node) {
    bus::Reader arguments(call->message());
    const std::uint32_t id = node ? *node : arguments.number();
    const std::uint32_t property = arguments.number();
    std::vector<std::string> words = takeWords(arguments);
    const NodeView* view = call->parts().model.byId(id);
    if (view == nullptr) {
        throw Problem(Problem::notFound, "there is no node " + std::to_string(id), Problem::node);
    }
    if (words.empty()) {
        words.emplace_back();  // an empty list
    }
    const Property& row = writableRow(*view->node, std::to_string(property));
    const change::MeantChange change{view->node, &row, words, acceptedValue(row, words), ""};
    call->withCaller([call, change](const Caller& caller) { decide(call, {change, caller}); });
}

}  // namespace cvagent::service
