#include <algorithm>

#include "agent/cli/caller.h"
#include "agent/cli/changes.h"
#include "agent/cli/commands/commands.h"
#include "agent/cli/json.h"
#include "agent/cli/outcomes.h"
#include "agent/cli/print.h"
#include "agent/cli/prompt.h"
#include "agent/core/property_words.h"

namespace cvagent::commands {

namespace {

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

}  // namespace

namespace {

/// Whether it stays so as long as was asked for.
bool isKept(Session& session, const std::vector<MeantChange>& change, double seconds,
            const Request& request) {
    std::vector<Outcome> outcomes(1);
    outcomes.front().kind = Outcome::differs;
    verifyWithin(session, change, outcomes, seconds, request);
    if (outcomes.front().kind == Outcome::differs) {
        complain(printable(change.front().target()) + " differs: " + outcomes.front().reason);
    }
    return outcomes.front().kind != Outcome::differs;
}

}  // namespace

ExitStatus set(Session& session, const Options& options) {
    const NodeRef node = session.find(options.node);
    const Property& row = writableRow(*node, options.property);
    const IC::PropertyValue value = acceptedValue(row, options.values);
    if (const Label* drastic = drasticLabel(row, value); drastic != nullptr && !options.yes) {
        confirm(drastic->text);
    }
    const std::vector<MeantChange> change{{node, &row, options.values, value, ""}};
    refuseUnlessForced(change, objectionsTo(change), options.force);
    const Request request(callerName());
    const WriteResult result = session.write(node, row, options.values, request);
    session.showErrors(request);
    std::ranges::for_each(result.notes, [](const std::string& note) { complain(printable(note)); });
    session.tellMissingTools({result.after});
    if (result.problem) {
        throw Problem(*result.problem);
    }
    print(options.json ? json::change(*node, row.readable ? result.before : result.after, result.after)
                       : report(*node, result, row.readable, Style::detect()));
    const bool isSo = !options.verifySeconds || isKept(session, change, *options.verifySeconds, request);
    return isSo && isDone(result, row) ? ExitStatus::done : ExitStatus::failed;
}

}  // namespace cvagent::commands
