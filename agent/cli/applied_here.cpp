#include "agent/cli/applied_here.h"

#include <unistd.h>

#include "agent/cli/caller.h"
#include "agent/cli/print.h"
#include "agent/cli/safeguard.h"

namespace cvagent {

std::vector<change::Outcome> appliedHere(Session& session, const std::vector<change::MeantChange>& changes,
                                         const Options& options, change::Already already,
                                         std::optional<double> verifySeconds) {
    const change::Proposal proposal = change::propose(session, changes, Request(callerName()), already);
    if (!options.force) {
        change::refuse(proposal);
    }
    confirmDrastic(changes, options);
    change::ApplySettings settings;
    settings.rehearsal = rehearsalSettings(options);
    settings.force = options.force;
    settings.verifySeconds = verifySeconds;
    settings.request = [](const std::string& plan) {
        return Request(callerName(), Request::Clock::time_point::max(), plan);
    };
    settings.tell = complain;
    if (options.byService && geteuid() != 0) {
        settings.triesOut = false;
        complain("the changes are not tried out first: only root can do that where the service makes them");
    }
    ChangeSafeguard safeguard(options);
    settings.safeguard = &safeguard;
    return change::apply(session, proposal, settings);
}

}  // namespace cvagent
