// diff and export: what a file of changes and the host have in common.
#include <algorithm>
#include <nlohmann/json.hpp>
#include <set>

#include "agent/change/kept.h"
#include "agent/cli/changes.h"
#include "agent/cli/commands/commands.h"
#include "agent/cli/print.h"
#include "agent/core/property_words.h"

namespace cvagent::commands {

namespace {

using Json = nlohmann::ordered_json;

constexpr unsigned int kOrigin = 24;
constexpr const char* kFixedOrigin = "3";

/// Else its addresses are somebody else's. Where the plug-in knows of none, the system that keeps the
/// interface does.
bool hasFixedOrigin(const IC::MutableNode& node, const std::vector<Reading>& readings) {
    const auto origin = std::ranges::find(readings, kOrigin, &Reading::id);
    if (origin == readings.end() || origin->failed()) {
        return false;
    }
    return static_cast<std::string>(origin->value) == kFixedOrigin ||
           change::isKeptAlready(node, *origin->row, acceptedValue(*origin->row, {kFixedOrigin}));
}

std::vector<std::string> writableIds(const IC::MutableNode& node) {
    std::vector<std::string> ids;
    for (const Property* row : propertiesOf(node.nodeType())) {
        if (row->writable() && row->readable) {
            ids.push_back(std::to_string(row->id));
        }
    }
    return ids;
}

/// What is so for the moment only, without a file that has it, could not be told from drift.
bool isSo(const IC::MutableNode& node, const Reading& reading, const std::vector<std::string>& words) {
    const IC::PropertyValue value = acceptedValue(*reading.row, words);
    return change::standingOf(node, *reading.row, value, reading).outcome == WriteResult::applied;
}

/// What the host has in common for all its interfaces is exported once.
using Exported = std::set<std::pair<std::string, std::vector<std::string>>>;

void exportNode(Session& session, const NodeRef& node, const Request& request, Exported& ofHost,
                std::vector<change::NamedChange>& changes) {
    const std::vector<std::string> ids = writableIds(*node);
    if (ids.empty()) {
        return;
    }
    const std::vector<Reading> readings = session.read(node, ids, request);
    for (const Reading& reading : readings) {
        const auto words = change::wordsToSetBack(reading);
        if (!words || !isSo(*node, reading, *words) ||
            (change::needsFixedOrigin(*reading.row) && !hasFixedOrigin(*node, readings)) ||
            (change::isHosts(*reading.row) && !ofHost.insert({reading.row->name, *words}).second)) {
            continue;
        }
        changes.push_back({node->getPath(), reading.row->name, *words, ""});
    }
}

std::string joined(const std::vector<std::string>& words) {
    std::string text;
    for (const std::string& word : words) {
        text += (text.empty() ? "" : ", ") + printable(word);
    }
    return text.empty() ? "(empty)" : text;
}

std::string driftText(const change::MeantChange& change, const change::Found& found) {
    return printable(change.target()) + "\n    file  " + joined(change.words) + "\n    host  " +
           (found.reading.failed() ? printable(found.reading.complaint())
                                   : valueText(change.row, found.reading.value)) +
           "\n          " + printable(found.standing.reason) + "\n";
}

Json driftJson(const change::MeantChange& change, const change::Found& found) {
    return {{"path", change.node->getPath()},
            {"property", {{"id", change.row->id}, {"name", change.row->name}}},
            {"file", static_cast<std::string>(change.value)},
            {"host",
             found.reading.failed() ? Json(nullptr) : Json(static_cast<std::string>(found.reading.value))},
            {"verdict", found.standing.outcome == WriteResult::differs ? "differs" : "not known"},
            {"reason", found.standing.reason}};
}

}  // namespace

ExitStatus exportChanges(Session& session, const Options& options) {
    const Request request = ownRequest();
    std::vector<NodeRef> nodes;
    for (const std::string& word : options.nodes) {
        nodes.push_back(session.find(word));
    }
    if (nodes.empty()) {
        nodes = session.tree(request).nodes;
    }
    std::vector<change::NamedChange> changes;
    Exported ofHost;
    for (const NodeRef& node : nodes) {
        exportNode(session, node, request, ofHost, changes);
    }
    print(change::changeFileText(changes));
    session.showErrors(request);
    return ExitStatus::done;
}

ExitStatus diff(Session& session, const Options& options) {
    const Request request = ownRequest();
    std::string text;
    Json list = Json::array();
    const std::vector<change::MeantChange> changes = meantChanges(session, options);
    for (const change::MeantChange& change : changes) {
        const change::Found found = change::findNow(session, change, request);
        if (change::isDeed(*change.row)) {
            complain(printable(change.target()) + " is done, not kept: it is not compared");
        } else if (found.standing.outcome != WriteResult::applied) {
            text += driftText(change, found);
            list.push_back(driftJson(change, found));
        }
    }
    const bool isDrift = !list.empty();
    print(options.json ? Json{{"compared", changes.size()}, {"differences", std::move(list)}}.dump(
                             2, ' ', false, Json::error_handler_t::replace) +
                             "\n"
                       : text);
    session.showErrors(request);
    return isDrift ? ExitStatus::failed : ExitStatus::done;
}

}  // namespace cvagent::commands
