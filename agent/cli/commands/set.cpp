#include <poll.h>
#include <unistd.h>

#include <cstdio>

#include "agent/cli/commands/commands.h"
#include "agent/cli/json.h"
#include "agent/cli/print.h"
#include "agent/core/operations.h"
#include "agent/core/signals.h"

namespace cvagent::commands {

namespace {

/// The line that is typed, with its line break. Less at the end of input and when a signal comes.
std::string typedLine() {
    const OrderlyEnd waiting;
    std::string line;
    for (char typed = 0; typed != '\n' && StopSignals::received() == 0;) {
        pollfd ready[] = {{STDIN_FILENO, POLLIN, 0}, {StopSignals::descriptor(), POLLIN, 0}};
        if (poll(ready, 2, -1) < 0 || ready[0].revents == 0) {
            continue;
        }
        if (read(STDIN_FILENO, &typed, 1) != 1) {
            break;
        }
        line += typed;
    }
    return line;
}

/// Restarting and halting are asked for twice.
void confirm(PowerAction action) {
    const std::string what = action == PowerAction::restart ? "restart" : "halt";
    if (isatty(STDIN_FILENO) != 1) {
        throw Failure(ExitStatus::usage, "this would " + what + " the host; add --yes to do it");
    }
    ask("This will " + what + " the host at once. Go on? [y/N] ");
    const std::string answer = typedLine();
    if (StopSignals::received() != 0) {
        ask("\n");
        throw Interrupted();
    }
    if (answer != "y\n" && answer != "Y\n" && answer != "yes\n") {
        throw Failure(ExitStatus::refused, "nothing was done");
    }
}

std::string shown(const Reading& reading) {
    return reading.failed() ? printable(reading.complaint()) : valueText(reading.row, reading.value);
}

std::string report(const IC::MutableNode& node, const WriteResult& result, bool readable,
                   const Style& style) {
    const std::string head = style.strong(printable(node.getPath())) + "\n  " + result.after.name() + "\n";
    return head + (readable ? "    old  " + shown(result.before) + "\n    new  " + shown(result.after) + "\n"
                            : "    done\n");
}

}  // namespace

ExitStatus set(Session& session, const Options& options) {
    const NodeRef node = session.agent().find(options.node);
    const Property row = writableRow(*node, options.property);
    const IC::PropertyValue value = acceptedValue(row, options.values);
    if (const PowerAction action = powerAction(row, value); action != PowerAction::none && !options.yes) {
        confirm(action);
    }
    const Request request = ownRequest();
    const WriteResult result = session.agent().write(node, row, value, request);
    session.showErrors(request);
    if (result.problem) {
        throw Problem(*result.problem);
    }
    print(options.json ? json::change(*node, row.readable() ? result.before : result.after, result.after)
                       : report(*node, result, row.readable(), Style::detect()));
    if (result.outcome == WriteResult::differs) {
        complain(std::string("the host still has another value: ") + row.meaning);
    }
    return result.after.timedOut ? ExitStatus::failed : ExitStatus::done;
}

}  // namespace cvagent::commands
