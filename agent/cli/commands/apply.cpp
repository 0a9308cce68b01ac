#include <unistd.h>

#include "agent/cli/caller.h"
#include "agent/cli/changes.h"
#include "agent/cli/commands/commands.h"
#include "agent/cli/outcomes.h"
#include "agent/cli/print.h"

namespace cvagent::commands {

namespace {

/// The changes made by this process, one after the other, through the service or not.
std::vector<change::Outcome> applied(Session& session, const std::vector<change::MeantChange>& changes,
                                     const Options& options) {
    const change::Proposal proposal = change::propose(session, changes, Request(callerName()));
    if (!options.force) {
        change::refuse(proposal);
    }
    confirmDrastic(changes, options);
    change::ApplySettings settings;
    settings.rehearsal = rehearsalSettings(options);
    settings.force = options.force;
    settings.verifySeconds = options.verifySeconds.value_or(change::kVerifySeconds);
    settings.request = [](const std::string& plan) {
        return Request(callerName(), Request::Clock::time_point::max(), plan);
    };
    settings.tell = complain;
    if (options.byService && geteuid() != 0) {
        settings.triesOut = false;
        complain("the changes are not tried out first: only root can do that where the service makes them");
    }
    return change::apply(session, proposal, settings);
}

}  // namespace

ExitStatus apply(Session& session, const Options& options) {
    if (options.dryRun) {
        return plan(session, options);
    }
    const std::vector<change::MeantChange> changes = meantChanges(session, options);
    std::unique_ptr<std::vector<change::Outcome>> outcomes;
    if (options.byService) {
        confirmDrastic(changes, options);
        outcomes = session.apply(
            changes, {options.force, false, options.verifySeconds.value_or(change::kVerifySeconds)});
    }
    if (!outcomes) {
        outcomes = std::make_unique<std::vector<change::Outcome>>(applied(session, changes, options));
    }
    print(options.json ? outcomesJson(changes, *outcomes) : outcomesText(changes, *outcomes));
    return statusOf(*outcomes);
}

}  // namespace cvagent::commands
