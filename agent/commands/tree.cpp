#include <map>

#include "agent/commands/commands.h"
#include "agent/json.h"
#include "agent/print.h"
#include "agent/session.h"
#include "agent/tree.h"

namespace cvagent::commands {

namespace {

/// The facts that tell nodes of a class apart at a glance.
std::vector<unsigned int> tellingIds(unsigned int nodeType) {
    static const std::map<NodeType, std::vector<unsigned int>> ids = {
        {NodeType::computer, {108}},
        {NodeType::hardDrive, {37}},
        {NodeType::partition, {112}},
        {NodeType::networkPort, {123, 57}},
        {NodeType::team, {198, 165}},
        {NodeType::processor, {80}},
        {NodeType::ipConfig, {123, 25, 26, 27}}};
    const auto found = ids.find(static_cast<NodeType>(nodeType));
    return found == ids.end() ? std::vector<unsigned int>() : found->second;
}

bool saysNothing(const IC::PropertyValue& value) {
    const std::string text = static_cast<std::string>(value);
    return text.empty() || text == "0.0.0.0" || text == "0";
}

/// A stored value as a fact: the label of a code, the larger of two units.
std::string fact(const Property& row, const IC::PropertyValue& value) {
    std::string text = valueText(row, value);
    const bool coded = !row.labels.empty() && text.ends_with(')');
    if (coded) {
        const std::size_t start = text.find('(') + 1;
        return text.substr(start, text.size() - start - 1);
    }
    const std::size_t larger = row.unit == Unit::none ? std::string::npos : text.find(", ");
    return larger == std::string::npos ? text : text.substr(larger + 2);
}

std::string facts(const IC::MutableNode& node) {
    const Properties stored = storedProperties(node);
    std::string text;
    for (const unsigned int id : tellingIds(node.nodeType())) {
        const auto value = stored.find(id);
        const auto row = findProperty(node.nodeType(), id);
        if (value != stored.end() && row && !saysNothing(value->second)) {
            text += (text.empty() ? "" : ", ") + fact(*row, value->second);
        }
    }
    return text;
}

std::string branch(const std::vector<bool>& last, const Style& style) {
    std::string text;
    for (std::size_t level = 1; level < last.size(); ++level) {
        const bool own = level + 1 == last.size();
        if (style.lines) {
            text += own ? (last[level] ? "└── " : "├── ") : (last[level] ? "    " : "│   ");
        } else {
            text += own ? (last[level] ? "`-- " : "|-- ") : (last[level] ? "    " : "|   ");
        }
    }
    return text;
}

std::string drawing(const std::vector<Handle>& nodes, const Style& style) {
    std::string text;
    for (const Placed& placed : drawingOrder(nodes)) {
        const IC::MutableNode& node = *placed.node;
        const std::string description = printable(node.getDescription());
        const std::string known = facts(node);
        text += style.faint(branch(placed.last, style)) + style.strong(printable(pathComponent(node)));
        text += " " + style.faint("[" + std::to_string(node.getNodeId()) + "]");
        text += description.empty() ? "" : "  " + description;
        text += (known.empty() ? "" : ": " + known) + "\n";
    }
    return text;
}

}  // namespace

ExitStatus tree(const Options& options) {
    const Style style = Style::detect();
    Session session(options);
    const std::vector<Handle> nodes = session.interface().holdAll();
    print(options.json ? json::tree(session.pluginFile(), nodes) : drawing(nodes, style));
    return ExitStatus::done;
}

}  // namespace cvagent::commands
