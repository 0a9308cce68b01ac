// The method Plan: judged, consented to, tried out, told.
#include <malloc.h>

#include "agent/service/change_request.h"

namespace cvagent::service {

namespace {

constexpr std::chrono::seconds kReadTime{30};
/// A message of the bus may be twice as long.
constexpr std::size_t kLongestPlan = std::size_t{16} << 20;

Audience plannersOf(const std::vector<change::MeantChange>& /*changes*/) {
    return Audience::planners;
}

/// Only root is told what not everybody may read, for the plan was made as root.
std::string previewText(Agent& agent, const change::RehearsalSettings& settings, const Caller& caller,
                        const std::vector<change::MeantChange>& changes) {
    AgentHost host(agent);
    const Request request("a plan on the bus", Request::Clock::now() + kReadTime);
    const change::Proposal proposal = change::propose(host, changes, request);
    change::Plan plan = change::rehearse(settings, proposal);
    if (!Consent::isOwn(caller)) {
        plan = change::withoutSecrets(std::move(plan));
    }
    std::string text = change::toJson(change::previewOf(proposal, std::move(plan)));
    if (text.size() > kLongestPlan) {
        throw Problem(Problem::failed, "the plan is too long for the bus", Problem::plan);
    }
    return text;
}

void perform(const CallPointer& call, const Caller& caller, const std::vector<change::MeantChange>& changes) {
    try {
        const Parts& parts = call->parts();
        const std::string text = previewText(parts.agent, parts.rehearsal, caller, changes);
        comeBack(call, [call, text] { call->answer([&text](bus::Writer& writer) { writer.put(text); }); });
    } catch (const change::CannotRehearse& cannot) {
        throw Problem(Problem::failed, std::string("there is no plan: ") + cannot.what(), Problem::plan);
    }
    malloc_trim(0);  // a plan is large, and the next one may be days away
}

}  // namespace

void startPlan(const CallPointer& call) {
    bus::Reader arguments(call->message());
    ifAllowed(call, takeChanges(arguments), {plannersOf, "plan"},
              [call](const Caller& caller, const std::vector<change::MeantChange>& changes) {
                  submit(call, call->parts().planners, caller,
                         [call, caller, changes] { perform(call, caller, changes); });
              });
}

}  // namespace cvagent::service
