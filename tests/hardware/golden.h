#pragma once

#include <algorithm>
#include <cstdlib>
#include <fstream>
#include <map>
#include <sstream>
#include <string>
#include <vector>

#include "plugins/hardware/hardware_mi.h"

/// The tree of the plug-in as text, to be compared with what stands in a file.
namespace golden {

inline std::string text(const IC::PropertyValue& value) {
    if (const auto* texts = value.asTexts()) {
        std::string all;
        for (const std::string& one : *texts) {
            all += (all.empty() ? "" : " | ") + one;
        }
        return all;
    }
    std::ostringstream out;
    out << value;
    return out.str();
}

/// "Name: value unit" in the order of the catalogue; an id that is not in there stands as a number.
inline std::string facts(const hardware::Facts::Map& facts, const std::string& indent) {
    static const std::vector<hardware::Row> kRows = hardware::allRows();
    std::string all;
    for (const auto& [id, value] : facts) {
        const auto row =
            std::find_if(kRows.begin(), kRows.end(), [id = id](const auto& one) { return one.id == id; });
        const bool known = row != kRows.end();
        all += indent + (known ? row->name : std::to_string(id)) + ": " + text(value);
        all += (known && *row->unit != '\0' ? std::string(" ") + row->unit : "") + "\n";
    }
    return all;
}

/// "/hardware/link:eth0", the path of a node.
inline std::string path(hardware::HardwareMI& plugin, IC::MutableNode& node) {
    const auto type = static_cast<hardware::Class>(node.nodeType());
    const hardware::ClassRow& row = hardware::classRow(type);
    std::string own = std::string("/") + row.name;
    IC::PropertyValue name;
    if (row.several && node.getProperty(hardware::firstId(type), name).getStatus() == 0) {
        own += ":" + text(name);
    }
    const auto above = plugin.hold(node.getLinkedId());
    return above == nullptr ? own : path(plugin, *above) + own;
}

/// All nodes, each with its stored properties, in the order of the plug-in's list.
inline std::string tree(hardware::HardwareMI& plugin) {
    std::string all;
    for (const auto& node : plugin.holdAll()) {
        hardware::Facts::Map stored;
        node->getProperties(stored);
        all += path(plugin, *node) + "\n" + facts(stored, "    ");
    }
    return all;
}

/// The tree of a recorded host, with what only root may read.
inline std::string tree(const std::string& root) {
    hardware::HardwareMI plugin{hardware::Host(root, true)};
    plugin.initialize(1, IC::Number(1U), IC::Number(2U));
    return tree(plugin);
}

/// What a file holds. CORVISTA_REWRITE_GOLDEN=1 puts `now` there first.
inline std::string expected(const std::string& file, const std::string& now) {
    if (std::getenv("CORVISTA_REWRITE_GOLDEN") != nullptr) {
        std::ofstream(file) << now;
    }
    std::ostringstream content;
    content << std::ifstream(file).rdbuf();
    return content.str();
}

}  // namespace golden
