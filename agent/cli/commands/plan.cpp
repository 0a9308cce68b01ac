#include <unistd.h>
#include <algorithm>
#include <iterator>
#include <nlohmann/json.hpp>

#include "agent/cli/caller.h"
#include "agent/cli/commands/commands.h"
#include "agent/cli/plan_text.h"
#include "agent/cli/print.h"
#include "agent/cli/rehearsed.h"

namespace cvagent::commands {

namespace {

using Json = nlohmann::ordered_json;

Json targets(const std::vector<MeantChange>& changes) {
    Json list = Json::array();
    for (const MeantChange& change : changes) {
        list.push_back({{"path", change.node->getPath()}, {"property", change.row->name}});
    }
    return list;
}

std::string planJson(const change::Plan& plan, const std::vector<MeantChange>& changes,
                     const std::vector<change::Objection>& objections,
                     const std::vector<MeantChange>& unchanged) {
    Json list = Json::array();
    for (const change::Objection& each : objections) {
        list.push_back({{"path", changes[each.change].node->getPath()},
                        {"property", changes[each.change].row->name},
                        {"reason", each.reason}});
    }
    const Json whole{{"objections", std::move(list)},
                     {"unchanged", targets(unchanged)},
                     {"plan", Json::parse(change::toJson(plan))}};
    return whole.dump(2, ' ', false, Json::error_handler_t::replace) + "\n";
}

change::Plan planOf(const Options& options, const std::vector<MeantChange>& changes) {
    if (changes.empty()) {
        return {};
    }
    if (geteuid() != 0) {
        complain("the plan is made as this user: what only root may read or do is not in it");
    }
    try {
        return rehearsed(options, changes);
    } catch (const change::CannotRehearse& cannot) {
        throw Failure(ExitStatus::failed, std::string("there is no plan: ") + printable(cannot.what()));
    }
}

ExitStatus verdictOn(const change::Plan& plan, const std::vector<change::Objection>& objections) {
    if (!objections.empty()) {
        return ExitStatus::refused;
    }
    const bool fails = std::ranges::any_of(
        plan.answers, [](const change::Answer& answer) { return !answer.failure().empty(); });
    return fails ? ExitStatus::failed : ExitStatus::done;
}

}  // namespace

ExitStatus plan(Session& session, const Options& options) {
    const Request request(callerName());
    const std::vector<MeantChange> changes = meantChanges(session, options);
    std::vector<Found> found;
    std::ranges::transform(changes, std::back_inserter(found),
                           [&](const MeantChange& change) { return findNow(session, change, request); });
    const std::vector<std::size_t> order = toBeMade(changes, found);
    std::vector<MeantChange> made;
    std::ranges::transform(order, std::back_inserter(made), [&changes](std::size_t i) { return changes[i]; });
    std::vector<MeantChange> unchanged;
    for (std::size_t i = 0; i < changes.size(); ++i) {
        if (std::ranges::find(order, i) == order.end()) {
            unchanged.push_back(changes[i]);
        }
    }
    const auto objections =
        options.force ? std::vector<change::Objection>() : objectionsToThese(changes, order);
    for (const change::Objection& each : objections) {
        complain("refused without --force: " + printable(changes[each.change].target()) + ": " +
                 printable(each.reason));
    }
    const change::Plan plan = planOf(options, made);
    if (options.json) {
        print(planJson(plan, changes, objections, unchanged));
    } else {
        std::string text;
        for (const MeantChange& change : unchanged) {
            text += "unchanged  " + printable(change.target()) + "\n";
        }
        print(text + (made.empty() ? "" : planText(plan, Style::detect())));
    }
    return verdictOn(plan, objections);
}

}  // namespace cvagent::commands
