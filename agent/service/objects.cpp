#include "agent/service/objects.h"

#include <algorithm>
#include <array>
#include <iterator>
#include <utility>

#include "agent/service/introspection.h"
#include "agent/service/names.h"
#include "agent/service/standard_calls.h"

namespace cvagent::service {

namespace {

/// Where a method is to be found.
enum class On { agent, nodes, everything };

struct Method {
    const char* interface;
    const char* name;
    const char* arguments;
    On on;
    void (*call)(const CallPointer& call, const Place& place);
};

constexpr Method kMethods[] = {
    {kAgentInterface, "Tree", "", On::agent, [](const CallPointer& call, const Place&) { answerTree(call); }},
    {kAgentInterface, "Find", "s", On::agent,
     [](const CallPointer& call, const Place&) { answerFind(call); }},
    {kAgentInterface, "FindAndRead", "sas", On::agent,
     [](const CallPointer& call, const Place&) { startFindAndRead(call); }},
    {kAgentInterface, "Read", "uau", On::agent,
     [](const CallPointer& call, const Place&) { startRead(call, std::nullopt); }},
    {kAgentInterface, "Write", "uuv", On::agent,
     [](const CallPointer& call, const Place&) { startWrite(call, std::nullopt); }},
    {kAgentInterface, "Plan", "a(ssv)", On::agent,
     [](const CallPointer& call, const Place&) { startPlan(call); }},
    {kAgentInterface, "Apply", "a(ssv)a{sv}", On::agent,
     [](const CallPointer& call, const Place&) { startApply(call); }},
    {kAgentInterface, "Confirm", "u", On::agent,
     [](const CallPointer& call, const Place&) { startConfirm(call); }},
    {kAgentInterface, "Lengthen", "ud", On::agent,
     [](const CallPointer& call, const Place&) { startLengthen(call); }},
    {kAgentInterface, "Rollback", "u", On::agent,
     [](const CallPointer& call, const Place&) { startRollback(call); }},
    {kAgentInterface, "EventsSince", "t", On::agent,
     [](const CallPointer& call, const Place&) { answerEventsSince(call); }},
    {kNodeInterface, "Read", "au", On::nodes,
     [](const CallPointer& call, const Place& place) { startRead(call, place.node->id); }},
    {kNodeInterface, "Write", "uv", On::nodes,
     [](const CallPointer& call, const Place& place) { startWrite(call, place.node->id); }},
    {"org.freedesktop.DBus.Introspectable", "Introspect", "", On::everything, introspectObject},
    {"org.freedesktop.DBus.ObjectManager", "GetManagedObjects", "", On::agent, managedObjects},
    {"org.freedesktop.DBus.Properties", "Get", "ss", On::everything, getProperty},
    {"org.freedesktop.DBus.Properties", "GetAll", "s", On::everything, getAllProperties},
    {"org.freedesktop.DBus.Properties", "Set", "ssv", On::everything, setProperty},
};

bool isOn(const Method& method, const Place& place) {
    return method.on == On::everything || (method.on == On::agent ? place.isAgent : place.node != nullptr);
}

/// A call may leave the interface out.
const Method& methodOf(const bus::Message& message, const Place& place) {
    const std::string interface = message.interface();
    const std::string member = message.member();
    const auto found = std::ranges::find_if(kMethods, [&](const Method& method) {
        return member == method.name && (interface.empty() || interface == method.interface) &&
               isOn(method, place);
    });
    if (found != std::end(kMethods)) {
        return *found;
    }
    const bool known = std::ranges::any_of(
        kMethods, [&](const Method& method) { return interface == method.interface && isOn(method, place); });
    throw bus::Error(known ? bus::kUnknownMethod : bus::kUnknownInterface,
                     place.object + " has no method " + interface + (interface.empty() ? "" : ".") + member);
}

}  // namespace

void Objects::serve() {
    slot_ = parts_.connection.serve(kRootObject, [this](const bus::Message& message) { handle(message); });
}

std::vector<std::string> Objects::methods() {
    std::vector<std::string> all;
    std::ranges::transform(kMethods, std::back_inserter(all), [](const Method& method) {
        return std::string(method.interface) + " " + method.name + " " + method.arguments;
    });
    return all;
}

void Objects::handle(const bus::Message& message) {
    if (!message.isMethodCall()) {
        return;
    }
    ++handled_;
    const auto call = heldForLoop(parts_.mailbox, PendingCall(parts_, message));
    if (!call->isRead()) {
        return;
    }
    call->guarded([&] {
        const std::string object = message.path();
        const Place place{object, parts_.model.byObject(object), object == kRootObject, standing_};
        if (place.node == nullptr && !leadsSomewhere(parts_.model, object)) {
            throw bus::Error(bus::kUnknownObject, "there is no object " + object);
        }
        const Method& method = methodOf(message, place);
        if (message.signature() != method.arguments) {
            throw bus::Error(bus::kInvalidArgs, std::string(method.name) + " takes '" + method.arguments +
                                                    "', not '" + message.signature() + "'");
        }
        method.call(call, place);
    });
}

}  // namespace cvagent::service
