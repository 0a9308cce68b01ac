#include "agent/core/tree.h"
#include "agent/cli/commands/commands.h"
#include "agent/cli/json.h"
#include "agent/cli/print.h"

namespace cvagent::commands {

namespace {

bool saysNothing(const IC::PropertyValue& value) {
    const std::string text = static_cast<std::string>(value);
    return text.empty() || text == "0.0.0.0" || text == "0";
}

/// A stored value in short: the label of a code, the larger of two units.
std::string fact(const Property& row, const IC::PropertyValue& value) {
    std::string text = valueText(&row, value);
    const bool coded = !row.labels.empty() && text.ends_with(')');
    if (coded) {
        const std::size_t start = text.find('(') + 1;
        return text.substr(start, text.size() - start - 1);
    }
    const std::size_t larger = row.unit == Unit::none ? std::string::npos : text.find(", ");
    return larger == std::string::npos ? text : text.substr(larger + 2);
}

/// What tells the node from others of its class.
std::string facts(const IC::MutableNode& node) {
    const NodeClass* nodeClass = findClass(node.nodeType());
    if (nodeClass == nullptr) {
        return {};
    }
    const Properties stored = storedProperties(node);
    std::string text;
    for (const unsigned int id : nodeClass->telling) {
        const auto value = stored.find(id);
        const Property* row = findProperty(node.nodeType(), id);
        if (value != stored.end() && row != nullptr && !saysNothing(value->second)) {
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

std::string drawing(const std::vector<NodeRef>& nodes, const Style& style) {
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

ExitStatus tree(Session& session, const Options& options) {
    const std::vector<NodeRef> nodes = session.agent().nodes();
    print(options.json ? json::tree(session.agent().plugins(), nodes) : drawing(nodes, Style::detect()));
    return ExitStatus::done;
}

}  // namespace cvagent::commands
