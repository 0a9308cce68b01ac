#include "agent/service/standard_calls.h"

#include <algorithm>
#include <array>
#include <iterator>
#include <string_view>

#include "agent/bus/reader.h"
#include "agent/service/introspection.h"
#include "agent/service/log.h"
#include "agent/service/members.h"
#include "agent/service/names.h"
#include "agent/service/values.h"

namespace cvagent::service {

namespace {

struct AgentProperty {
    const char* name;
    void (*put)(bus::Writer& writer, const Parts& parts, const Standing& standing);
};

void putTime(bus::Writer& writer, std::uint64_t value) {
    writer.variant("t", [&] { writer.put(value); });
}

void putText(bus::Writer& writer, const std::string& value) {
    writer.variant("s", [&] { writer.put(value); });
}

constexpr AgentProperty kAgentProperties[] = {
    {"Version",
     [](bus::Writer& writer, const Parts&, const Standing& standing) { putText(writer, standing.version); }},
    {"Plugins", [](bus::Writer& writer, const Parts& parts,
                   const Standing&) { writer.variant("as", [&] { writer.put(parts.agent.plugins()); }); }},
    {"StartedAt", [](bus::Writer& writer, const Parts&,
                     const Standing& standing) { putTime(writer, standing.startedAt); }},
    {"LookedAt",
     [](bus::Writer& writer, const Parts&, const Standing& standing) { putTime(writer, standing.lookedAt); }},
    {"LastEvent", [](bus::Writer& writer, const Parts&,
                     const Standing& standing) { putTime(writer, standing.lastEvent); }},
    {"Consent", [](bus::Writer& writer, const Parts& parts,
                   const Standing&) { putText(writer, parts.consent.source()); }},
};

/// Those without properties of ours.
bool isStandard(const std::string& interface) {
    constexpr std::array<std::string_view, 4> kStandard = {
        "org.freedesktop.DBus.Peer", "org.freedesktop.DBus.Introspectable", "org.freedesktop.DBus.Properties",
        "org.freedesktop.DBus.ObjectManager"};
    return std::ranges::find(kStandard, interface) != kStandard.end();
}

[[noreturn]] void failWithoutInterface(const Place& place, const std::string& interface) {
    throw bus::Error(bus::kUnknownInterface, place.object + " has no interface " + interface);
}

void checkInterface(const Place& place, const std::string& interface) {
    const bool known =
        interface.empty() || isStandard(interface) || (place.isAgent && interface == kAgentInterface) ||
        (place.node != nullptr && (interface == kNodeInterface || interface == place.node->interface));
    if (!known) {
        failWithoutInterface(place, interface);
    }
}

const AgentProperty* findAgentProperty(const std::string& name) {
    const auto found = std::ranges::find(kAgentProperties, name, &AgentProperty::name);
    return found == std::end(kAgentProperties) ? nullptr : &*found;
}

bool isNodeProperty(const Place& place, const std::string& name) {
    return place.node != nullptr && hasNodeProperty(name);
}

/// Nothing tells a property that the class has from one that it has not but the catalogue.
bool isOfClass(const NodeView& node, const std::string& name) {
    return std::ranges::any_of(propertiesOf(node.type),
                               [&name](const Property* row) { return name == row->name; });
}

[[noreturn]] void failWithoutProperty(const Place& place, const std::string& name) {
    if (place.node != nullptr && (findByName(*place.node, name) != nullptr || isOfClass(*place.node, name))) {
        throw bus::Error(kNotKnown, name + " of " + place.node->path + " is not known");
    }
    throw bus::Error(bus::kUnknownProperty, place.object + " has no property " + name);
}

/// A property of the node's class; who may not see it hears so.
void getOfClass(const CallPointer& call, const Place& place, const std::string& name) {
    const Reading* reading = place.node != nullptr ? findByName(*place.node, name) : nullptr;
    if (reading == nullptr || !isKnown(*reading)) {
        failWithoutProperty(place, name);
    }
    const auto tell = [call, value = reading->value] {
        call->answer([&](bus::Writer& writer) { putProperty(writer, value); });
    };
    if (!isTrusted(*reading)) {
        tell();
        return;
    }
    const std::string target = place.node->path + " " + name;
    call->withCaller([call, tell, target](const Caller& caller) {
        call->parts().consent.ask(
            caller, {Audience::trusted, "", false}, [&](bool allowed, const std::string& reason) {
                if (!allowed) {
                    log(Priority::warning,
                        "uid " + std::to_string(caller.user) + " may not read " + target + ": " + reason);
                    throw bus::Error(bus::kAccessDenied, reason);
                }
                tell();
            });
    });
}

void putAgentProperties(bus::Writer& writer, const Parts& parts, const Standing& standing) {
    writer.array("{sv}", [&] {
        for (const AgentProperty& property : kAgentProperties) {
            writer.entry("sv", [&] {
                writer.put(property.name);
                property.put(writer, parts, standing);
            });
        }
    });
}

void getAllOfClass(const CallPointer& call, std::uint32_t id) {
    call->withCaller([call, id](const Caller& caller) {
        const NodeView* node = call->parts().model.byId(id);
        if (node == nullptr) {
            throw bus::Error(bus::kUnknownObject, "the node is gone");
        }
        const bool trusted = call->parts().consent.isTrusted(caller);
        call->answer([&](bus::Writer& writer) { putClassProperties(writer, *node, trusted); });
    });
}

}  // namespace

void introspectObject(const CallPointer& call, const Place& place) {
    call->inTurn([call, object = place.object](const Caller& /*caller*/) {
        const Model& model = call->parts().model;
        const std::string text = introspect(model, object, model.byObject(object));
        call->answer([&](bus::Writer& writer) { writer.put(text); });
    });
}

void managedObjects(const CallPointer& call, const Place& /*place*/) {
    call->inTurn([call](const Caller& caller) {
        const bool trusted = call->parts().consent.isTrusted(caller);
        const Model& model = call->parts().model;
        call->answer([&](bus::Writer& writer) {
            writer.array("{oa{sa{sv}}}", [&] {
                for (const NodeView* node : model.all()) {
                    writer.entry("oa{sa{sv}}", [&] {
                        writer.putPath(node->object);
                        putInterfaces(writer, model, *node, trusted);
                    });
                }
            });
        });
    });
}

void getProperty(const CallPointer& call, const Place& place) {
    bus::Reader arguments(call->message());
    const std::string interface = arguments.text();
    const std::string name = arguments.text();
    checkInterface(place, interface);
    const auto meant = [&interface](const std::string& one) { return interface.empty() || interface == one; };
    if (const AgentProperty* own = findAgentProperty(name);
        place.isAgent && own != nullptr && meant(kAgentInterface)) {
        call->answer([&](bus::Writer& writer) { own->put(writer, call->parts(), place.standing); });
    } else if (isNodeProperty(place, name) && meant(kNodeInterface)) {
        call->answer(
            [&](bus::Writer& writer) { putNodeProperty(writer, call->parts().model, *place.node, name); });
    } else if (place.node != nullptr && meant(place.node->interface)) {
        getOfClass(call, place, name);
    } else {
        throw bus::Error(bus::kUnknownProperty, place.object + " has no property " + name);
    }
}

void getAllProperties(const CallPointer& call, const Place& place) {
    const std::string interface = bus::Reader(call->message()).text();
    checkInterface(place, interface);
    if (place.isAgent && (interface.empty() || interface == kAgentInterface)) {
        call->answer([&](bus::Writer& writer) { putAgentProperties(writer, call->parts(), place.standing); });
    } else if (place.node != nullptr && (interface.empty() || interface == kNodeInterface)) {
        call->answer(
            [&](bus::Writer& writer) { putNodeProperties(writer, call->parts().model, *place.node); });
    } else if (place.node != nullptr && interface == place.node->interface) {
        getAllOfClass(call, place.node->id);
    } else {
        call->answer([](bus::Writer& writer) { writer.array("{sv}", [] {}); });
    }
}

void setProperty(const CallPointer& call, const Place& place) {
    bus::Reader arguments(call->message());
    const std::string interface = arguments.text();
    const std::string name = arguments.text();
    checkInterface(place, interface);
    const bool known =
        (place.isAgent && findAgentProperty(name) != nullptr) || isNodeProperty(place, name) ||
        (place.node != nullptr && (findByName(*place.node, name) != nullptr || isOfClass(*place.node, name)));
    if (!known) {
        throw bus::Error(bus::kUnknownProperty, place.object + " has no property " + name);
    }
    throw bus::Error(bus::kPropertyReadOnly, "properties are read-only; the method Write changes the host");
}

}  // namespace cvagent::service
