#include "agent/core/node_classes.h"

#include <algorithm>

#include "agent/core/catalogue.h"

namespace cvagent {

namespace {

using Naming = NodeClass::Naming;

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
