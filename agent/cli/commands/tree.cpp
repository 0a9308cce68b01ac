#include "agent/core/tree.h"

#include <algorithm>
#include <map>

#include "agent/cli/commands/commands.h"
#include "agent/cli/json.h"
#include "agent/cli/print.h"
#include "agent/core/oshw/unshown_links.h"

namespace cvagent::commands {

namespace {

bool saysNothing(const IC::PropertyValue& value) {
    const std::string text = static_cast<std::string>(value);
    return text.empty() || text == "0.0.0.0" || text == "0";
}

using Readings = std::vector<std::vector<Reading>>;

/// A value in short: the label of a code, the larger of two units.
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
std::string facts(const IC::MutableNode& node, const std::vector<Reading>& readings) {
    const NodeClass* nodeClass = findClass(node.nodeType());
    if (nodeClass == nullptr) {
        return {};
    }
    std::string text;
    for (const unsigned int id : nodeClass->telling) {
        const auto told = std::ranges::find(readings, id, &Reading::id);
        if (told != readings.end() && !told->failed() && told->row != nullptr && !saysNothing(told->value)) {
            text += (text.empty() ? "" : ", ") + fact(*told->row, told->value);
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

std::string drawing(const std::vector<NodeRef>& nodes, const Readings& readings, const Style& style) {
    std::map<unsigned int, const std::vector<Reading>*> byId;
    for (std::size_t i = 0; i < nodes.size(); ++i) {
        byId.emplace(nodes[i]->getNodeId(), &readings[i]);
    }
    std::string text;
    for (const Placed& placed : drawingOrder(nodes)) {
        const IC::MutableNode& node = *placed.node;
        const std::string description = printable(node.getDescription());
        const std::string known = facts(node, *byId.at(node.getNodeId()));
        text += style.faint(branch(placed.last, style)) + style.strong(printable(pathComponent(node)));
        text += " " + style.faint("[" + std::to_string(node.getNodeId()) + "]");
        text += description.empty() ? "" : "  " + description;
        text += (known.empty() ? "" : ": " + known) + "\n";
    }
    return text;
}

/// A link without a node is no fault, but who misses it is to know that the kernel has it.
void hintAtLinks(const std::vector<std::string>& unshown) {
    constexpr std::size_t kMost = 8;
    std::string names;
    for (std::size_t i = 0; i < std::min(unshown.size(), kMost); ++i) {
        names += (i == 0 ? " " : ", ") + inQuotes(unshown[i]);
    }
    if (!unshown.empty()) {
        complain("links of the kernel that the tree has no node for:" + names +
                 (unshown.size() > kMost ? " and " + std::to_string(unshown.size() - kMost) + " more" : ""));
    }
}

}  // namespace

ExitStatus tree(Session& session, const Options& options) {
    session.tellMissingTools({});
    const Request request = ownRequest();
    const auto [plugins, nodes, readings] = session.tree(request);
    print(options.json ? json::tree(plugins, nodes, readings) : drawing(nodes, readings, Style::detect()));
    session.showErrors(request);
    hintAtLinks(oshw::unshownLinks(nodes));
    return ExitStatus::done;
}

}  // namespace cvagent::commands
