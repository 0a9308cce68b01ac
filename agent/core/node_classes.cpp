#include "agent/core/node_classes.h"

#include <algorithm>

namespace cvagent {

namespace {

using Naming = NodeClass::Naming;

constexpr NodeClass kClasses[] = {
    {NodeType::osHardware, "oshw", Naming::single, 0},
    {NodeType::root, "root", Naming::single, 0},
    {NodeType::computer, "computer", Naming::single, 0},
    {NodeType::chassis, "chassis", Naming::single, 0},
    {NodeType::planar, "planar", Naming::single, 0},
    {NodeType::networkController, "network-controller", Naming::single, 0},
    {NodeType::diskController, "disk-controller", Naming::single, 0},
    {NodeType::hardDrive, "hard-drive", Naming::byProperty, 89},
    {NodeType::partition, "partition", Naming::byProperty, 89},
    {NodeType::networkPort, "network-port", Naming::byProperty, 108},
    {NodeType::ipConfig, "ip-config", Naming::byProperty, 108},
    {NodeType::lanEndpoint, "lan-endpoint", Naming::byProperty, 108},
    {NodeType::team, "team", Naming::byProperty, 197},
    {NodeType::processor, "processor", Naming::byIndex, 0},
};

constexpr const char* kDevices = "/dev/";

/// The name a node stores, fit for a path: /dev/sda is "sda". Empty when it has none.
std::string storedName(const IC::MutableNode& node, unsigned int property) {
    const Properties stored = storedProperties(node);
    const auto found = stored.find(property);
    const std::string* text = found == stored.end() ? nullptr : found->second.asText();
    if (text == nullptr) {
        return {};
    }
    std::string name = text->starts_with(kDevices) ? text->substr(std::string(kDevices).size()) : *text;
    std::replace(name.begin(), name.end(), '/', '!');
    return name;
}

}  // namespace

std::span<const NodeClass> nodeClasses() {
    return kClasses;
}

const NodeClass* findClass(unsigned int nodeType) {
    const auto* found = std::find_if(
        std::begin(kClasses), std::end(kClasses),
        [nodeType](const NodeClass& row) { return static_cast<unsigned int>(row.type) == nodeType; });
    return found == std::end(kClasses) ? nullptr : found;
}

const NodeClass* findClass(const std::string& name) {
    const auto* found = std::find_if(std::begin(kClasses), std::end(kClasses),
                                     [&name](const NodeClass& row) { return row.name == name; });
    return found == std::end(kClasses) ? nullptr : found;
}

std::string className(unsigned int nodeType) {
    const NodeClass* known = findClass(nodeType);
    return known != nullptr ? known->name : "type-" + std::to_string(nodeType);
}

Properties storedProperties(const IC::MutableNode& node) {
    Properties stored;
    node.getProperties(stored);
    return stored;
}

std::string pathComponent(const IC::MutableNode& node) {
    std::string name = className(node.nodeType());
    const NodeClass* known = findClass(node.nodeType());
    if (known != nullptr && known->naming == Naming::single) {
        return name;
    }
    const std::string own = known != nullptr && known->naming == Naming::byProperty
                                ? storedName(node, known->nameProperty)
                                : std::string();
    return name + ":" + (own.empty() ? std::to_string(node.getIndex()) : own);
}

}  // namespace cvagent
