#include <algorithm>

#include "agent/cli/commands/commands.h"
#include "agent/cli/json.h"
#include "agent/cli/print.h"

namespace cvagent::commands {

namespace {

std::string listing(const IC::MutableNode& node, const std::vector<Reading>& readings, const Style& style) {
    std::size_t width = 0;
    for (const Reading& reading : readings) {
        width = std::max(width, reading.name().size());
    }
    const std::string description = printable(node.getDescription());
    std::string text = style.strong(printable(node.getPath())) + " " +
                       style.faint("[" + std::to_string(node.getNodeId()) + "]") +
                       (description.empty() ? "" : "  " + description) + "\n";
    for (const Reading& reading : readings) {
        const std::string id = std::to_string(reading.id);
        text += "  " + style.faint(std::string(id.size() < 5 ? 5 - id.size() : 0, ' ') + id) + "  " +
                padded(reading.name(), width) + "  ";
        text += reading.failed() ? style.bad(printable(reading.complaint()))
                                 : valueText(reading.row, reading.value);
        text += "\n";
    }
    return text;
}

/// Properties that were asked for by name must all be there. In a listing of everything a host may well not
/// know some, but it must have answered.
ExitStatus verdict(const IC::MutableNode& node, const std::vector<Reading>& readings, bool named) {
    const auto failed = [](const Reading& reading) { return reading.failed(); };
    const auto unknown = [](const Reading& reading) { return reading.missing && reading.row == nullptr; };
    if (named && std::any_of(readings.begin(), readings.end(), unknown)) {
        complain("there is no such property; see: cvagent properties " + className(node.nodeType()));
        return ExitStatus::notFound;
    }
    const auto timedOut = [](const Reading& reading) { return reading.timedOut; };
    if (std::any_of(readings.begin(), readings.end(), timedOut)) {
        return ExitStatus::failed;
    }
    const bool bad = named ? std::any_of(readings.begin(), readings.end(), failed)
                           : !readings.empty() && std::all_of(readings.begin(), readings.end(), failed);
    return bad ? ExitStatus::failed : ExitStatus::done;
}

}  // namespace

ExitStatus get(Session& session, const Options& options) {
    const Request request = ownRequest();
    const auto [node, readings] = session.findAndRead(options.node, options.properties, request);
    session.tellMissingTools(readings);
    print(options.json ? json::node(*node, readings) : listing(*node, readings, Style::detect()));
    session.showErrors(request);
    return verdict(*node, readings, !options.properties.empty());
}

}  // namespace cvagent::commands
