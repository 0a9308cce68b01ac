#include <algorithm>

#include "agent/cli/commands/commands.h"
#include "agent/cli/json.h"
#include "agent/cli/print.h"

namespace cvagent::commands {

namespace {

std::vector<NodeClass> wantedClasses(const std::string& name) {
    if (name.empty()) {
        return nodeClasses();
    }
    if (const NodeClass* known = findClass(name)) {
        return {*known};
    }
    std::string message = "there is no class " + inQuotes(name) + "; the classes are:";
    for (const NodeClass& row : nodeClasses()) {
        message += std::string(" ") + row.name;
    }
    throw Failure(ExitStatus::notFound, message);
}

const char* accessText(const Property& row) {
    if (!row.readable) {
        return "write";
    }
    return row.writable() ? "read, write" : "read";
}

std::string kindAndUnit(const Property& row) {
    const std::string unit = unitName(row.unit);
    return std::string(kindName(row.kind)) + (unit.empty() ? "" : ", " + unit);
}

std::string labelText(const Property& row) {
    std::string text;
    for (const Label& label : row.labels) {
        text += (text.empty() ? "" : ", ") + std::to_string(label.code) + " " + label.text;
    }
    return text;
}

std::string describe(const Property& row, const Style& style) {
    const std::string id = std::to_string(row.id);
    const std::string indent(31, ' ');
    std::string text = "  " + style.faint(std::string(4 - std::min<std::size_t>(4, id.size()), ' ') + id) +
                       "  " + style.strong(padded(row.name, 21)) + "  " + padded(kindAndUnit(row), 22) +
                       "  " + padded(accessText(row), 11) + "\n" + indent + row.meaning + "\n";
    if (!row.labels.empty()) {
        text += indent + style.faint("values: ") + labelText(row) + "\n";
    }
    if (row.writable()) {
        text += indent + style.faint("accepts: ") + acceptedText(row) + "\n";
    }
    return text;
}

std::string describeClass(const NodeClass& nodeClass, const Style& style) {
    std::string text = style.strong(nodeClass.name) + "\n";
    const std::vector<const Property*> rows = propertiesOf(static_cast<unsigned int>(nodeClass.type));
    if (rows.empty()) {
        return text + "  no properties\n";
    }
    for (const Property* row : rows) {
        text += describe(*row, style);
    }
    return text;
}

}  // namespace

ExitStatus properties(const Options& options) {
    const Style style = Style::detect();
    std::vector<const Property*> rows;
    std::string text;
    for (const NodeClass& nodeClass : wantedClasses(options.nodeClass)) {
        const auto own = propertiesOf(static_cast<unsigned int>(nodeClass.type));
        rows.insert(rows.end(), own.begin(), own.end());
        text += (text.empty() ? "" : "\n") + describeClass(nodeClass, style);
    }
    print(options.json ? json::catalogue(rows) : text);
    return ExitStatus::done;
}

}  // namespace cvagent::commands
