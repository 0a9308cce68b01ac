#include <unistd.h>

#include <algorithm>

#include "agent/cli/caller.h"
#include "agent/cli/changes.h"
#include "agent/cli/commands/commands.h"
#include "agent/cli/plan_text.h"
#include "agent/cli/print.h"

namespace cvagent::commands {

namespace {

change::Plan planOf(const change::Proposal& proposal, const Options& options) {
    if (geteuid() != 0 && !proposal.order.empty()) {
        complain("the plan is made as this user: what only root may read or do is not in it");
    }
    try {
        return change::rehearse(rehearsalSettings(options), proposal);
    } catch (const change::CannotRehearse& cannot) {
        throw Failure(ExitStatus::failed, std::string("there is no plan: ") + printable(cannot.what()));
    }
}

void complainOf(change::Preview& preview, const Options& options) {
    if (options.force) {
        preview.objections.clear();
    }
    for (const change::Preview::Target& each : preview.objections) {
        complain("refused without --force: " + printable(each.path) + " " + printable(each.property) + ": " +
                 printable(each.reason));
    }
}

/// Made by this process.
change::Preview ownPreview(Session& session, const std::vector<change::MeantChange>& changes,
                           const Options& options) {
    const change::Proposal proposal = change::propose(session, changes, Request(callerName()));
    change::Preview preview = change::previewOf(proposal, {});
    complainOf(preview, options);
    preview.plan = planOf(proposal, options);
    return preview;
}

std::string previewText(const change::Preview& preview) {
    std::string text;
    for (const change::Preview::Target& each : preview.unchanged) {
        text += "unchanged  " + printable(each.path) + " " + printable(each.property) + "\n";
    }
    return text + (preview.plan.changes.empty() ? "" : planText(preview.plan, Style::detect()));
}

ExitStatus verdictOn(const change::Preview& preview) {
    if (!preview.objections.empty()) {
        return ExitStatus::refused;
    }
    const bool fails = std::ranges::any_of(
        preview.plan.answers, [](const change::Answer& answer) { return !answer.failure().empty(); });
    return fails ? ExitStatus::failed : ExitStatus::done;
}

}  // namespace

ExitStatus plan(Session& session, const Options& options) {
    const std::vector<change::MeantChange> changes = meantChanges(session, options);
    const auto services = options.byService ? session.preview(changes) : nullptr;
    if (services) {
        complainOf(*services, options);
    }
    const change::Preview preview = services ? *services : ownPreview(session, changes, options);
    print(options.json ? change::toJson(preview) + "\n" : previewText(preview));
    return verdictOn(preview);
}

}  // namespace cvagent::commands
