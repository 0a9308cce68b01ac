#include "agent/change/apply.h"

#include <algorithm>
#include <utility>

#include "agent/core/text.h"

namespace cvagent::change {

namespace {

/// Why the changes should not be made after they were tried out; "" when they would come about.
std::string failureIn(const Plan& plan) {
    for (const Answer& answer : plan.answers) {
        // One that was not found there tells nothing of the deed.
        const bool isFound = answer.property.find_first_not_of("0123456789") != std::string::npos;
        if (!answer.failure().empty() && isFound) {
            return answer.failure();
        }
    }
    return {};
}

/// Tries the changes out where that can be done.
std::optional<Plan> triedOut(const Proposal& proposal, const ApplySettings& settings) {
    try {
        Plan plan = rehearse(settings.rehearsal, proposal);
        const std::string failure = settings.force ? "" : failureIn(plan);
        if (!failure.empty()) {
            throw Problem(Problem::failed, "tried out, it fails: " + printable(failure), Problem::objection);
        }
        return plan;
    } catch (const CannotRehearse& cannot) {
        settings.tell(std::string("the changes are not tried out first: ") + printable(cannot.what()));
        return std::nullopt;
    }
}

void beginGuarded(const Proposal& proposal, const std::optional<Plan>& plan, const ApplySettings& settings) {
    if (settings.safeguard == nullptr) {
        return;
    }
    settings.safeguard->begin(toBeMade(proposal), plan ? plan->files : std::vector<FileChange>());
}

/// @return whether all of it is taken back
bool endGuarded(const ApplySettings& settings, std::vector<Outcome>& outcomes) {
    const bool hasFailed = std::ranges::find(outcomes, Outcome::failed, &Outcome::kind) != outcomes.end();
    if (settings.safeguard == nullptr || !settings.safeguard->end(hasFailed)) {
        return false;
    }
    for (Outcome& outcome : outcomes) {
        const bool isMade = outcome.kind != Outcome::failed && outcome.kind != Outcome::unchanged;
        outcome.reason = isMade && outcome.kind != Outcome::notMade ? "taken back" : outcome.reason;
        outcome.kind = isMade ? Outcome::notMade : outcome.kind;
    }
    return true;
}

/// What a write came to, before anybody has looked at it once more.
/// @param isLookedAt whether somebody will: then nothing is taken for granted
void take(const WriteResult& result, bool isLookedAt, Outcome& outcome) {
    outcome.before = result.before;
    outcome.after = result.after;
    outcome.notes = result.notes;
    outcome.complained = result.complained;
    outcome.lacking = result.lacking;
    outcome.problem = result.problem;
    if (result.problem) {
        outcome.kind = Outcome::failed;
        outcome.reason = printable(result.problem->what());
    } else if (!isLookedAt) {
        outcome.kind = kindOf(result.outcome);
    } else if (result.complained) {
        outcome.kind = Outcome::failed;
        outcome.reason = "the plug-in reported errors";
    } else {
        const bool isSo = result.outcome == WriteResult::applied && result.lacking.empty();
        outcome.kind = isSo ? Outcome::applied : Outcome::differs;  // until a look has told
    }
}

/// One before it may have brought it about.
bool isSoByNow(ChangedHost& host, const Proposal& proposal, std::size_t i, const Request& request,
               Outcome& outcome) {
    const MeantChange& change = proposal.changes[i];
    if (proposal.already == Already::made || isDeed(*change.row)) {
        return false;
    }
    const Found found = findNow(host, change, request);
    if (found.standing.outcome != WriteResult::applied) {
        return false;
    }
    outcome.kind = Outcome::applied;
    outcome.after = found.reading;
    return true;
}

/// Stops at the first change that fails: the ones behind it count on it.
/// @param plan for the record, with the first write
void make(ChangedHost& host, const Proposal& proposal, const ApplySettings& settings, const std::string& plan,
          std::vector<Outcome>& outcomes) {
    Request request = settings.request(plan);
    for (const std::size_t i : proposal.order) {
        const MeantChange& change = proposal.changes[i];
        if (isSoByNow(host, proposal, i, request, outcomes[i])) {
            continue;
        }
        const bool isLookedAt = settings.verifySeconds.has_value();
        if (settings.safeguard != nullptr) {
            settings.safeguard->beginStep();
        }
        take(host.write(change.node, *change.row, change.words, request), isLookedAt, outcomes[i]);
        host.showErrors(request);
        request = settings.request("");
        if (outcomes[i].kind == Outcome::failed) {
            return;
        }
        if (isLookedAt && (!change.row->readable || change.drastic() != nullptr)) {
            outcomes[i].kind = Outcome::notKnown;
        }
    }
}

}  // namespace

std::vector<Outcome> apply(ChangedHost& host, const Proposal& proposal, const ApplySettings& settings) {
    std::vector<Outcome> outcomes(proposal.changes.size());
    for (std::size_t i = 0; i < outcomes.size(); ++i) {
        outcomes[i].kind = proposal.isToBeMade(i) ? Outcome::notMade : Outcome::unchanged;
        outcomes[i].before = outcomes[i].after = proposal.found[i].reading;
    }
    if (proposal.order.empty()) {
        return outcomes;
    }
    if (!settings.force) {
        refuse(proposal);
    } else if (!proposal.objections.empty()) {
        settings.tell("done all the same: " + objectionsText(proposal));
    }
    std::optional<Plan> plan = settings.triesOut ? triedOut(proposal, settings) : std::nullopt;
    if (settings.goesOn && !settings.goesOn()) {
        throw Problem(Problem::busy, "the agent ends; nothing was done");
    }
    beginGuarded(proposal, plan, settings);
    make(host, proposal, settings, plan ? toJson(withoutSecrets(*std::move(plan))) : "", outcomes);
    if (!endGuarded(settings, outcomes) && settings.verifySeconds) {
        verifyWithin(host, proposal.changes, outcomes, *settings.verifySeconds, settings.request(""),
                     settings.goesOn);
    }
    return outcomes;
}

}  // namespace cvagent::change
