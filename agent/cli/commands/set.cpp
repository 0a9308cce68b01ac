#include <algorithm>

#include "agent/change/revocable.h"
#include "agent/cli/applied_here.h"
#include "agent/cli/caller.h"
#include "agent/cli/changes.h"
#include "agent/cli/commands/commands.h"
#include "agent/cli/json.h"
#include "agent/cli/print.h"
#include "agent/cli/safeguard.h"

namespace cvagent::commands {

namespace {

using change::MeantChange;
using change::Outcome;

std::string shown(const Reading& reading) {
    return reading.failed() ? printable(reading.complaint()) : valueText(reading.row, reading.value);
}

std::string report(const IC::MutableNode& node, const WriteResult& result, bool readable,
                   const Style& style) {
    const std::string head = style.strong(printable(node.getPath())) + "\n  " + result.after.name() + "\n";
    return head + (readable ? "    old  " + shown(result.before) + "\n    new  " + shown(result.after) + "\n"
                            : "    done\n");
}

/// Says why the write cannot count as done.
bool isDone(const WriteResult& result, const Property& row) {
    if (!result.lacking.empty()) {
        complain(std::string(row.name) + " was not changed, or only in part: " + result.lacking + "; " +
                 row.meaning);
    } else if (result.outcome == WriteResult::differs) {
        complain(std::string("the host still has another value: ") + row.meaning);
    }
    return result.lacking.empty() && !result.complained && !result.after.timedOut;
}

/// Whether it is so as long as was asked for.
bool isKept(const MeantChange& change, const Outcome& outcome) {
    if (outcome.kind == Outcome::differs) {
        complain(printable(change.target()) + " differs: " + outcome.reason);
    }
    return outcome.kind != Outcome::differs;
}

bool isKept(Session& session, const std::vector<MeantChange>& changes, double seconds,
            const Request& request) {
    std::vector<Outcome> outcomes(1);
    outcomes.front().kind = Outcome::differs;
    change::verifyWithin(session, changes, outcomes, seconds, request);
    return isKept(changes.front(), outcomes.front());
}

void tell(Session& session, const MeantChange& change, const WriteResult& result, bool json) {
    std::ranges::for_each(result.notes, [](const std::string& note) { complain(printable(note)); });
    session.tellMissingTools({result.after});
    if (result.problem) {
        throw Problem(*result.problem);
    }
    const bool isReadable = change.row->readable;
    print(json ? json::change(*change.node, isReadable ? result.before : result.after, result.after)
               : report(*change.node, result, isReadable, Style::detect()));
}

/// What the write itself came to; a look since then has the last word.
WriteResult resultOf(const Outcome& outcome) {
    WriteResult result;
    result.before = outcome.before;
    result.after = outcome.after;
    result.outcome = outcome.kind == Outcome::applied   ? WriteResult::applied
                     : outcome.kind == Outcome::differs ? WriteResult::differs
                                                        : WriteResult::notKnown;
    result.complained = outcome.complained;
    result.lacking = outcome.lacking;
    result.notes = outcome.notes;
    result.problem = outcome.problem;
    return result;
}

void refuseUnlessForced(const std::vector<MeantChange>& changes, bool force) {
    change::Proposal proposal;
    proposal.changes = changes;
    proposal.objections = change::objectionsTo(changes);
    if (!force) {
        change::refuse(proposal);
    } else if (!proposal.objections.empty()) {
        complain("done all the same: " + change::objectionsText(proposal));
    }
}

ExitStatus setHere(Session& session, const std::vector<MeantChange>& changes, const Options& options) {
    const MeantChange& change = changes.front();
    refuseUnlessForced(changes, options.force);
    const Request request(callerName());
    change::RevocableSettings settings;
    settings.caller = callerName();
    settings.tell = complain;
    const WriteResult result = change::writeRevocably(session, change, request, settings);
    session.showErrors(request);
    tell(session, change, result, options.json);
    const bool isSo = !options.verifySeconds || isKept(session, changes, *options.verifySeconds, request);
    return isSo && isDone(result, *change.row) ? ExitStatus::done : ExitStatus::failed;
}

}  // namespace

ExitStatus set(Session& session, const Options& options) {
    const std::vector<MeantChange> changes = meantChanges(session, options);
    std::unique_ptr<std::vector<Outcome>> outcomes;
    const std::optional<double> confirmed = confirmSeconds(options, changes);
    if (options.byService || !confirmed) {
        confirmDrastic(changes, options);
    }
    if (options.byService) {
        outcomes = session.apply(
            changes, {options.force, true, options.verifySeconds, confirmed, !options.confirmSeconds});
    }
    if (!outcomes && confirmed) {
        outcomes = std::make_unique<std::vector<Outcome>>(
            appliedHere(session, changes, options, change::Already::made, options.verifySeconds));
    }
    if (!outcomes) {
        return setHere(session, changes, options);
    }
    const WriteResult result = resultOf(outcomes->front());
    tell(session, changes.front(), result, options.json);
    const bool isSo = !options.verifySeconds || isKept(changes.front(), outcomes->front());
    return isSo && isDone(result, *changes.front().row) ? ExitStatus::done : ExitStatus::failed;
}

}  // namespace cvagent::commands
