#include <unistd.h>
#include <algorithm>
#include <iterator>

#include "agent/cli/caller.h"
#include "agent/cli/commands/commands.h"
#include "agent/cli/outcomes.h"
#include "agent/cli/print.h"
#include "agent/cli/rehearsed.h"
#include "agent/core/property_words.h"

namespace cvagent::commands {

namespace {

/// Tries the changes out where that can be done. Throws Failure when they would not come about.
/// @return the plan for the record; "" where there is none
std::string triedOut(const Options& options, const std::vector<MeantChange>& changes,
                     const std::vector<std::size_t>& order) {
    if (options.byService && geteuid() != 0) {
        complain("the changes are not tried out first: only root can do that where the service makes them");
        return {};
    }
    std::vector<MeantChange> ordered;
    std::ranges::transform(order, std::back_inserter(ordered),
                           [&changes](std::size_t i) { return changes[i]; });
    change::Plan plan;
    try {
        plan = rehearsed(options, ordered);
    } catch (const change::CannotRehearse& cannot) {
        complain(std::string("the changes are not tried out first: ") + printable(cannot.what()));
        return {};
    }
    for (const change::Answer& answer : plan.answers) {
        // One that was not found there tells nothing of the deed.
        const bool isFound = answer.property.find_first_not_of("0123456789") != std::string::npos;
        if (!answer.failure().empty() && isFound && !options.force) {
            throw Failure(ExitStatus::failed, "tried out, it fails: " + printable(answer.failure()) +
                                                  "\nNothing was done; --force does it all the same");
        }
    }
    return change::toJson(change::withoutSecrets(std::move(plan)));
}

/// What a write came to, before anybody has looked at it once more.
void take(const WriteResult& result, Outcome& outcome) {
    outcome.before = result.before;
    outcome.after = result.after;
    outcome.notes = result.notes;
    if (result.problem) {
        outcome.kind = Outcome::failed;
        outcome.reason = printable(result.problem->what());
    } else if (result.complained) {
        outcome.kind = Outcome::failed;
        outcome.reason = "the plug-in reported errors";
    } else {
        const bool isSo = result.outcome == WriteResult::applied && result.lacking.empty();
        outcome.kind = isSo ? Outcome::applied : Outcome::differs;  // until a look has told
    }
}

/// Stops at the first change that fails: the ones behind it count on it.
/// @param plan for the record, with the first write
void make(Session& session, const std::vector<MeantChange>& changes, const std::vector<std::size_t>& order,
          std::vector<Outcome>& outcomes, const std::string& plan) {
    Request request(callerName(), Request::Clock::time_point::max(), plan);
    for (const std::size_t i : order) {
        const MeantChange& change = changes[i];
        const Found found = findNow(session, change, request);  // one before it may have brought it about
        if (!change::isDeed(*change.row) && found.standing.outcome == WriteResult::applied) {
            outcomes[i].kind = Outcome::applied;
            outcomes[i].after = found.reading;
            continue;
        }
        take(session.write(change.node, *change.row, change.words, request), outcomes[i]);
        session.showErrors(request);
        request = Request(callerName());
        if (outcomes[i].kind == Outcome::failed) {
            return;
        }
        if (!change.row->readable || drasticLabel(*change.row, change.value) != nullptr) {
            outcomes[i].kind = Outcome::notKnown;
        }
    }
}

}  // namespace

ExitStatus apply(Session& session, const Options& options) {
    if (options.dryRun) {
        return plan(session, options);
    }
    const Request request(callerName());
    const std::vector<MeantChange> changes = meantChanges(session, options);
    std::vector<Found> found;
    std::vector<Outcome> outcomes(changes.size());
    for (std::size_t i = 0; i < changes.size(); ++i) {
        found.push_back(findNow(session, changes[i], request));
        outcomes[i].kind = Outcome::unchanged;
        outcomes[i].before = outcomes[i].after = found[i].reading;
    }
    const std::vector<std::size_t> order = toBeMade(changes, found);
    refuseUnlessForced(changes, objectionsToThese(changes, order), options.force);
    confirmDrastic(changes, options);
    if (!order.empty()) {
        for (const std::size_t i : order) {
            outcomes[i].kind = Outcome::notMade;
        }
        const std::string plan = triedOut(options, changes, order);
        make(session, changes, order, outcomes, plan);
        verifyWithin(session, changes, outcomes, options.verifySeconds.value_or(kVerifySeconds), request);
    }
    print(options.json ? outcomesJson(changes, outcomes) : outcomesText(changes, outcomes));
    return statusOf(outcomes);
}

}  // namespace cvagent::commands
