#include "agent/verify/verify.h"

#include <unistd.h>

#include <algorithm>
#include <cctype>
#include <cstring>

#include "agent/core/host_tools.h"
#include "agent/core/problem.h"
#include "agent/core/text.h"
#include "agent/verify/fact.h"
#include "agent/verify/kernel.h"

namespace cvagent::verify {

namespace {

/// The plug-in's commands look for names anywhere in a line.
std::string namePartOf(const Kernel& kernel, const std::string& name) {
    for (const hosttools::Link& link : kernel.links()) {
        if (link.name != name && !name.empty() && link.name.find(name) != std::string::npos) {
            return "the name is part of " + inQuotes(link.name) + ", of which this may be";
        }
    }
    return {};
}

/// What the plug-in lets stand bare in a command.
bool isLetIntoCommands(const std::string& name) {
    return !name.starts_with('-') && std::ranges::all_of(name, [](char letter) {
        const auto byte = static_cast<unsigned char>(letter);
        return std::isalnum(byte) != 0 || byte > 127 || std::strchr("._:@%+=,/-", letter) != nullptr;
    });
}

std::string refusedName(const std::string& name) {
    return isLetIntoCommands(name) ? "" : "no command is run with such a name";
}

std::string missingToolOf(const std::string& property) {
    for (const MissingTool& missing : missingTools()) {
        if (missing.costsProperty(property)) {
            return "there is no " + missing.tool + " (package " + missing.package + ")";
        }
    }
    return {};
}

std::string countedAsBond(const Check& check, const std::string& name) {
    const bool isState = check.type == NodeType::networkPort && check.id == 123;
    return isState && name.find("bond") != std::string::npos
               ? "with 'bond' in its name it counts as a bond: up while all its members are"
               : "";
}

std::string reasonFor(const Kernel& kernel, const Check& check, const std::string& name,
                      const std::string& property) {
    std::vector<std::string> reasons{missingToolOf(property), countedAsBond(check, name),
                                     check.why == nullptr ? "" : check.why};
    if (check.type == NodeType::networkPort || check.type == NodeType::ipConfig) {
        reasons.insert(reasons.begin(), {refusedName(name), namePartOf(kernel, name)});
    }
    std::string why;
    for (const std::string& reason : reasons) {
        why += (why.empty() || reason.empty() ? "" : "; or ") + reason;
    }
    return why.empty() ? "it has changed meanwhile, or the host's tool tells it otherwise: see cvagent doctor"
                       : why;
}

const Reading* readingOf(const std::vector<Reading>& readings, unsigned int id) {
    const auto found = std::ranges::find(readings, id, &Reading::id);
    return found == readings.end() || found->failed() ? nullptr : &*found;
}

std::string textOf(const Reading* reading) {
    return reading == nullptr ? "" : static_cast<std::string>(reading->value);
}

void compare(const Kernel& kernel, const Check& check, const IC::MutableNode& node,
             const std::vector<Reading>& readings, Result& result) {
    const Reading* reading = readingOf(readings, check.id);
    const bool isThere =
        static_cast<unsigned int>(check.type) == node.nodeType() && (reading != nullptr || check.isOptional);
    const Fact fact{textOf(readingOf(readings, check.nameProperty)), textOf(reading), node.getIndex()};
    const bool hasName = check.nameProperty == 0 || !fact.name.empty();
    const bool isAlias = fact.name.find(':') != std::string::npos;  // it has no link of its own
    const Text says = isThere && hasName && !isAlias ? check.says(kernel, fact) : std::nullopt;
    if (!says) {
        return;
    }
    ++result.compared;
    if (*says != fact.shown) {
        const Property* row = findProperty(node.nodeType(), check.id);
        const std::string property = row != nullptr ? row->name : std::to_string(check.id);
        result.differences.push_back(
            {node.getPath(), property, fact.shown, *says, reasonFor(kernel, check, fact.name, property)});
    }
}

bool isOf(NodeType type, const NodeRef& node) {
    return node->nodeType() == static_cast<unsigned int>(type);
}

/// They hang below the planar; another plug-in's tree alone has neither.
void compareProcessors(const std::vector<NodeRef>& nodes, Result& result) {
    const auto planar =
        std::ranges::find_if(nodes, [](const NodeRef& node) { return isOf(NodeType::planar, node); });
    if (planar == nodes.end()) {
        return;
    }
    const auto shown =
        std::ranges::count_if(nodes, [](const NodeRef& node) { return isOf(NodeType::processor, node); });
    const long online = sysconf(_SC_NPROCESSORS_ONLN);
    ++result.compared;
    if (shown != online) {
        result.differences.push_back({(*planar)->getPath(), "processors", std::to_string(shown),
                                      std::to_string(online),
                                      "/proc/cpuinfo of this machine has not one entry for each"});
    }
}

}  // namespace

Result verify(const std::vector<NodeRef>& nodes, const std::vector<std::vector<Reading>>& readings) {
    const Kernel kernel;
    if (kernel.problem() != 0) {
        throw Problem(Problem::failed,
                      std::string("the kernel tells no links: ") + std::strerror(kernel.problem()));
    }
    Result result;
    for (std::size_t i = 0; i < nodes.size(); ++i) {
        for (const auto& checks : {linkChecks(), addressChecks(), hostChecks()}) {
            for (const Check& check : checks) {
                compare(kernel, check, *nodes[i], readings[i], result);
            }
        }
    }
    compareProcessors(nodes, result);
    return result;
}

}  // namespace cvagent::verify
