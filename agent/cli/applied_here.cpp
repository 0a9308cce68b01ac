#include "agent/cli/applied_here.h"

#include <unistd.h>

#include "agent/change/revocable.h"
#include "agent/cli/caller.h"
#include "agent/cli/print.h"
#include "agent/cli/safeguard.h"
#include "agent/core/signals.h"

namespace cvagent {

namespace {

/// A write of the service goes on when who asked for it has died; its commands are ended after ten seconds
/// each.
constexpr std::uint64_t kServiceSettles = 20'000;

change::RevocableSettings revocableSettings(const Options& options, const change::Proposal& proposal) {
    change::RevocableSettings settings;
    settings.caller = callerName();
    settings.seconds = confirmSeconds(options, change::toBeMade(proposal));
    settings.madeUnguarded = !options.confirmSeconds;
    settings.keepsHalf = options.force;
    settings.settling = options.byService ? kServiceSettles : 0;
    settings.tell = complain;
    settings.beforeTakingBack = [] { StopSignals::ignore(); };  // broken off it would leave half of it
    if (settings.seconds && geteuid() != 0 && options.confirmSeconds) {
        throw Failure(ExitStatus::failed,
                      "only root can have a change taken back; nothing was done\nRun: sudo cvagent");
    }
    return settings;
}

}  // namespace

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
    change::Revocable revocable(revocableSettings(options, proposal));
    settings.safeguard = &revocable;
    return change::apply(session, proposal, settings);
}

}  // namespace cvagent
