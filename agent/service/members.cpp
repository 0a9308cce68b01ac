#include "agent/service/members.h"

#include <algorithm>
#include <iterator>

#include "agent/service/names.h"
#include "agent/service/values.h"

namespace cvagent::service {

namespace {

struct NodeProperty {
    const char* name;
    void (*put)(bus::Writer& writer, const Model& model, const NodeView& node);
};

void number(bus::Writer& writer, std::uint32_t value) {
    writer.variant("u", [&] { writer.put(value); });
}

void text(bus::Writer& writer, const std::string& value) {
    writer.variant("s", [&] { writer.put(value); });
}

constexpr NodeProperty kNodeProperties[] = {
    {"Id", [](bus::Writer& writer, const Model&, const NodeView& node) { number(writer, node.id); }},
    {"Parent",
     [](bus::Writer& writer, const Model& model, const NodeView& node) {
         writer.variant("o", [&] { writer.putPath(model.parentOf(node)); });
     }},
    {"Class", [](bus::Writer& writer, const Model&, const NodeView& node) { text(writer, node.nodeClass); }},
    {"Index", [](bus::Writer& writer, const Model&, const NodeView& node) { number(writer, node.index); }},
    {"Path", [](bus::Writer& writer, const Model&, const NodeView& node) { text(writer, node.path); }},
    {"Description",
     [](bus::Writer& writer, const Model&, const NodeView& node) { text(writer, node.description); }},
    {"Status", [](bus::Writer& writer, const Model&, const NodeView& node) { number(writer, node.status); }},
    {"ReadAt", [](bus::Writer& writer, const Model&,
                  const NodeView& node) { writer.variant("t", [&] { writer.put(node.readAt); }); }},
};

}  // namespace

bool hasNodeProperty(const std::string& name) {
    return std::ranges::find(kNodeProperties, name, &NodeProperty::name) != std::end(kNodeProperties);
}

void putNodeProperty(bus::Writer& writer, const Model& model, const NodeView& node, const std::string& name) {
    std::ranges::find(kNodeProperties, name, &NodeProperty::name)->put(writer, model, node);
}

void putNodeProperties(bus::Writer& writer, const Model& model, const NodeView& node) {
    writer.array("{sv}", [&] {
        for (const NodeProperty& property : kNodeProperties) {
            writer.entry("sv", [&] {
                writer.put(property.name);
                property.put(writer, model, node);
            });
        }
    });
}

const Reading* findByName(const NodeView& node, const std::string& name) {
    const auto found = std::ranges::find_if(node.readings, [&name](const Reading& reading) {
        return propertyNameOf(reading.id, reading.row) == name;
    });
    return found == node.readings.end() ? nullptr : &*found;
}

void putClassProperties(bus::Writer& writer, const NodeView& node, bool withTrusted) {
    writer.array("{sv}", [&] {
        for (const Reading& reading : node.readings) {
            if (isKnown(reading) && (withTrusted || !isTrusted(reading))) {
                writer.entry("sv", [&] {
                    writer.put(propertyNameOf(reading.id, reading.row));
                    putProperty(writer, reading.value);
                });
            }
        }
    });
}

void putInterfaces(bus::Writer& writer, const Model& model, const NodeView& node, bool withTrusted) {
    writer.array("{sa{sv}}", [&] {
        writer.entry("sa{sv}", [&] {
            writer.put(kNodeInterface);
            putNodeProperties(writer, model, node);
        });
        writer.entry("sa{sv}", [&] {
            writer.put(node.interface);
            putClassProperties(writer, node, withTrusted);
        });
    });
}

void putNodeHead(bus::Writer& writer, const NodeView& node) {
    writer.put(node.id).put(node.parent).put(node.type).put(node.index).putPath(node.object);
    writer.put(node.nodeClass).put(node.path).put(node.description).put(node.status);
}

}  // namespace cvagent::service
