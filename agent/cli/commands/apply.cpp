#include "agent/cli/applied_here.h"
#include "agent/cli/changes.h"
#include "agent/cli/commands/commands.h"
#include "agent/cli/outcomes.h"
#include "agent/cli/print.h"
#include "agent/cli/safeguard.h"

namespace cvagent::commands {

ExitStatus apply(Session& session, const Options& options) {
    if (options.dryRun) {
        return plan(session, options);
    }
    const std::vector<change::MeantChange> changes = meantChanges(session, options);
    std::unique_ptr<std::vector<change::Outcome>> outcomes;
    if (options.byService) {
        confirmDrastic(changes, options);
        outcomes = session.apply(
            changes, {options.force, false, options.verifySeconds.value_or(change::kVerifySeconds),
                      confirmSeconds(options, changes), !options.confirmSeconds});
    }
    if (!outcomes) {
        outcomes = std::make_unique<std::vector<change::Outcome>>(
            appliedHere(session, changes, options, change::Already::leftOut,
                        options.verifySeconds.value_or(change::kVerifySeconds)));
    }
    print(options.json ? outcomesJson(changes, *outcomes) : outcomesText(changes, *outcomes));
    return statusOf(*outcomes);
}

}  // namespace cvagent::commands
