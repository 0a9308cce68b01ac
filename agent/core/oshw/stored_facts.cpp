#include "agent/core/oshw/stored_facts.h"

#include <algorithm>
#include <string>

#include "agent/core/node_classes.h"

namespace cvagent::oshw {

namespace {

constexpr unsigned int kEnumeratePorts = 74;
constexpr unsigned int kIpv6AddressType = 28;
constexpr unsigned int kPortState = 123;

/// The fourth group of an IPv6 address, as the plug-in's `cut -d: -f4` has it: a text without groups stays
/// whole.
IC::PropertyValue interfaceIdOf(const IC::PropertyValue& address) {
    const std::string text = static_cast<std::string>(address);
    std::size_t start = 0;
    constexpr int kGroupsBefore = 3;
    for (int group = 0; group < kGroupsBefore && text.find(':') != std::string::npos; ++group) {
        const std::size_t end = text.find(':', start);
        if (end == std::string::npos) {
            return {"", true};
        }
        start = end + 1;
    }
    const std::size_t end = std::min(text.find(':', start), text.size());
    return {text.substr(start, end - start), true};
}

/// Where the address comes from: 1 from a server, 3 fixed.
IC::PropertyValue originOf(const IC::PropertyValue& usesDhcp) {
    return {IC::EnumValue(static_cast<std::string>(usesDhcp) == "true" ? 1 : 3), true};
}

struct Derived {
    NodeType nodeClass;
    unsigned int from;
    unsigned int property;
    IC::PropertyValue (*value)(const IC::PropertyValue& from);
};

constexpr Derived kDerived[] = {
    {NodeType::ipConfig, 27, 29, interfaceIdOf},
    {NodeType::ipConfig, 186, 96, originOf},
};

bool isOf(const IC::MutableNode& node, NodeType nodeClass) {
    return node.nodeType() == static_cast<unsigned int>(nodeClass);
}

Reading* findReading(std::vector<Reading>& readings, unsigned int id) {
    const auto found = std::ranges::find(readings, id, &Reading::id);
    return found == readings.end() ? nullptr : &*found;
}

void derive(IC::MutableNode& node, std::vector<Reading>& readings) {
    for (const Derived& row : kDerived) {
        const Reading* from = isOf(node, row.nodeClass) ? findReading(readings, row.from) : nullptr;
        if (from == nullptr || from->failed() || from->value.empty()) {
            continue;
        }
        const IC::PropertyValue value = row.value(from->value);
        node.IC::MutableNode::setProperty(row.property, value);  // the store alone: no host is written to
        if (Reading* derived = findReading(readings, row.property)) {
            derived->value = value;
            derived->asOf = from->asOf;
        }
    }
}

/// A read that tells no type leaves the plug-in's own value for it.
void settleAddressType(const IC::MutableNode& node, std::vector<Reading>& readings) {
    Reading* type = isOf(node, NodeType::ipConfig) ? findReading(readings, kIpv6AddressType) : nullptr;
    if (type != nullptr && !type->failed() && type->value.kind() == IC::PropertyValue::none) {
        type->value = {IC::EnumValue(0), true};
    }
}

/// A tree shows what is stored, and does not show that a read of it fails; what only is late keeps its last
/// value.
void keepStored(const IC::MutableNode& node, std::vector<Reading>& readings) {
    const NodeClass* known = findClass(node.nodeType());
    const Properties stored = storedProperties(node);
    for (Reading& reading : readings) {
        const bool isLive =
            known != nullptr && std::ranges::find(known->live, reading.id) != known->live.end();
        const auto before = stored.find(reading.id);
        if (reading.failed() && !reading.timedOut && !isLive && before != stored.end()) {
            reading = {reading.id, reading.row, before->second, ""};
        }
    }
}

}  // namespace

void storeAnew(IC::MutableNode& node, std::vector<Reading>& readings) {
    keepStored(node, readings);
    derive(node, readings);
    settleAddressType(node, readings);
    const Reading* state = isOf(node, NodeType::networkPort) ? findReading(readings, kPortState) : nullptr;
    if (state != nullptr && !state->failed() && state->value.kind() == IC::PropertyValue::number) {
        node.setStatus(static_cast<unsigned int>(state->value));
    }
    std::erase_if(readings, [](const Reading& reading) {
        return reading.missing || (!reading.failed() && reading.value.kind() == IC::PropertyValue::none);
    });
}

bool takesLookForLinks(const IC::MutableNode& node) {
    return isOf(node, NodeType::ipConfig);
}

void lookForLinks(IC::MutableNode& node) {
    node.setProperty(kEnumeratePorts, {IC::Number(1U), true});
}

}  // namespace cvagent::oshw
