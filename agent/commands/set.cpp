#include <poll.h>
#include <unistd.h>

#include <cstdio>

#include "agent/command_deadline.h"
#include "agent/commands/commands.h"
#include "agent/json.h"
#include "agent/print.h"
#include "agent/session.h"
#include "agent/signals.h"
#include "agent/tree.h"

namespace cvagent::commands {

namespace {

constexpr unsigned int kPowerAction = 123;  // of the computer
constexpr unsigned int kRestart = 9;
constexpr unsigned int kHalt = 12;

Property writableRow(const IC::MutableNode& node, const std::string& word) {
    const std::string nodeClass = className(node.nodeType());
    const auto row = findProperty(node.nodeType(), word);
    if (!row) {
        throw Failure(ExitStatus::notFound, "a " + nodeClass + " has no property " + inQuotes(word) +
                                                "; see: cvagent properties " + nodeClass);
    }
    if (!row->writable()) {
        throw Failure(ExitStatus::refused, std::string(row->name) + " of a " + nodeClass +
                                               " cannot be written; see: cvagent properties " + nodeClass);
    }
    return *row;
}

std::string allQuoted(const std::vector<std::string>& words) {
    std::string text;
    for (const std::string& word : words) {
        if (text.size() > 200) {
            return text + " and more";
        }
        text += (text.empty() ? "" : " ") + inQuotes(word);
    }
    return text;
}

IC::PropertyValue checkedValue(const Property& row, const std::vector<std::string>& words) {
    const auto value = row.check(row, words);
    if (!value) {
        throw Failure(ExitStatus::refused, allQuoted(words) + " is not accepted for " + row.name +
                                               "; accepted: " + acceptedText(row));
    }
    return *value;
}

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
void confirmPower(const IC::MutableNode& node, const Property& row, const IC::PropertyValue& value,
                  bool yes) {
    const bool power =
        node.nodeType() == static_cast<unsigned int>(NodeType::computer) && row.id == kPowerAction;
    const unsigned int action = power ? static_cast<unsigned int>(value) : 0;
    if (yes || (action != kRestart && action != kHalt)) {
        return;
    }
    const std::string what = action == kRestart ? "restart" : "halt";
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

IC::Error callSetProperty(IC::MutableNode& node, const Property& row, const IC::PropertyValue& value) {
    try {
        return node.setProperty(row.id, value);
    } catch (const std::exception& exception) {
        return {IC::Error::failure, IC::Number(), std::string("the plug-in threw: ") + exception.what()};
    } catch (...) {
        return {IC::Error::failure, IC::Number(), "the plug-in threw an unknown exception"};
    }
}

void write(IC::MutableNode& node, const Property& row, const IC::PropertyValue& value, LogOutput& log) {
    const Errand errand(Errand::write);
    const IC::Error result = callSetProperty(node, row, value);
    log.showErrors();
    if (const std::string complaint = errand.complaint(); !complaint.empty()) {
        throw Failure(ExitStatus::failed,
                      std::string(row.name) + " may be changed only in part: " + complaint);
    }
    if (result.getStatus() != 0) {
        throw Failure(ExitStatus::failed, std::string(row.name) + " was not changed: " + errorText(result));
    }
}

std::string shown(const Reading& reading) {
    return reading.failed() ? printable(reading.complaint()) : valueText(reading.row, reading.value);
}

std::string report(const IC::MutableNode& node, const Reading& before, const Reading& after,
                   const Style& style) {
    return style.strong(printable(node.getPath())) + "\n  " + after.name() + "\n    old  " + shown(before) +
           "\n    new  " + shown(after) + "\n";
}

/// Not every write shows at once, and none of the host's commands tells.
void hintAtDifference(const Property& row, const IC::PropertyValue& written, const Reading& after) {
    const bool comparable = !after.failed() && after.value.kind() == written.kind() && row.labels.empty();
    if (comparable && static_cast<std::string>(after.value) != static_cast<std::string>(written)) {
        complain(std::string("the host still has another value: ") + row.meaning);
    }
}

void writeOnly(const IC::MutableNode& node, const Property& row, const Options& options, const Style& style) {
    const Reading none{row.id, row, {}, "can only be written", false};
    print(options.json ? json::change(node, none, none)
                       : style.strong(printable(node.getPath())) + "\n  " + row.name + "\n    done\n");
}

}  // namespace

ExitStatus set(const Options& options) {
    const Style style = Style::detect();
    Session session(options);
    const Handle node = findNode(session.interface(), options.node);
    const Property row = writableRow(*node, options.property);
    const IC::PropertyValue value = checkedValue(row, options.values);
    confirmPower(*node, row, value, options.yes);
    const Reading before = row.readable() ? readProperty(*node, row.id) : Reading();
    write(*node, row, value, session.log());
    setPaths(session.interface());  // some writes make new nodes
    if (!row.readable()) {
        writeOnly(*node, row, options, style);
        return ExitStatus::done;
    }
    const Reading after = readProperty(*node, row.id);
    print(options.json ? json::change(*node, before, after) : report(*node, before, after, style));
    hintAtDifference(row, value, after);
    session.log().showErrors();
    return after.timedOut ? ExitStatus::failed : ExitStatus::done;
}

}  // namespace cvagent::commands
