#include <algorithm>
#include <set>

#include "agent/commands/commands.h"
#include "agent/json.h"
#include "agent/print.h"
#include "agent/session.h"
#include "agent/tree.h"

namespace cvagent::commands {

namespace {

/// The id behind a word; a number need not be in the catalogue.
unsigned int idOf(const IC::MutableNode& node, const std::string& word) {
    if (const auto row = findProperty(node.nodeType(), word)) {
        if (!row->readable()) {
            throw Failure(ExitStatus::notFound, std::string(row->name) + " can be written but not read");
        }
        return row->id;
    }
    const std::string digits = "0123456789";
    if (!word.empty() && word.size() < 10 && word.find_first_not_of(digits) == std::string::npos) {
        return static_cast<unsigned int>(std::stoul(word));
    }
    const std::string nodeClass = className(node.nodeType());
    throw Failure(ExitStatus::notFound, "a " + nodeClass + " has no property " + inQuotes(word) +
                                            "; see: cvagent properties " + nodeClass);
}

/// What the catalogue knows of the class and whatever else the node has stored.
std::vector<unsigned int> allIds(const IC::MutableNode& node) {
    std::set<unsigned int> ids;
    for (const Property& row : propertiesOf(node.nodeType())) {
        if (row.readable()) {
            ids.insert(row.id);
        }
    }
    for (const auto& [id, value] : storedProperties(node)) {
        ids.insert(id);
    }
    return {ids.begin(), ids.end()};
}

std::vector<unsigned int> wantedIds(const IC::MutableNode& node, const std::vector<std::string>& words) {
    std::vector<unsigned int> ids;
    ids.reserve(words.size());
    for (const std::string& word : words) {
        ids.push_back(idOf(node, word));
    }
    return words.empty() ? allIds(node) : ids;
}

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
    const auto unknown = [](const Reading& reading) { return reading.missing && !reading.row; };
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

ExitStatus get(const Options& options) {
    const Style style = Style::detect();
    Session session(options);
    const Handle node = findNode(session.interface(), options.node);
    const std::vector<Reading> readings = readProperties(*node, wantedIds(*node, options.properties));
    print(options.json ? json::node(*node, readings) : listing(*node, readings, style));
    session.log().showErrors();
    return verdict(*node, readings, !options.properties.empty());
}

}  // namespace cvagent::commands
