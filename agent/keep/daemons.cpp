#include "agent/keep/daemons.h"

#include "agent/bus/reader.h"
#include "agent/bus/writer.h"
#include "agent/keep/bus.h"
#include "agent/keep/host_files.h"
#include "agent/keep/lost_manager.h"

namespace cvagent::keep {

namespace {

constexpr const char* kService = "org.freedesktop.NetworkManager";
constexpr const char* kNoObject = "/";
/// Of an active connection: it was made by looking at the link.
constexpr std::uint32_t kExternal = 0x80;

std::string interfaceOf(const std::string& what) {
    return std::string(kService) + what;
}

/// The file is told of what is saved alone, and not by versions of old.
std::string fileOf(PatientBus& bus, const std::string& connection) {
    try {
        return bus.text({kService, connection, interfaceOf(".Settings.Connection"), "Filename"});
    } catch (const bus::Error&) {
        return "";
    }
}

ManagedLink described(PatientBus& bus, const std::string& device) {
    ManagedLink link;
    link.device = device;
    link.isManaged = bus.flag({kService, device, interfaceOf(".Device"), "Managed"});
    const std::string active = bus.path({kService, device, interfaceOf(".Device"), "ActiveConnection"});
    if (link.isManaged && active != kNoObject) {
        const std::string interface = interfaceOf(".Connection.Active");
        link.isExternal = (bus.number({kService, active, interface, "StateFlags"}) & kExternal) != 0;
        link.connection = bus.text({kService, active, interface, "Id"});
        link.profile = bus.path({kService, active, interface, "Connection"});
        link.file = fileOf(bus, link.profile);
    }
    return link;
}

}  // namespace

struct Daemons::Bus : PatientBus {
    using PatientBus::PatientBus;
};

Daemons::Daemons(const std::string& bus) {
    try {
        bus_ = std::make_unique<Bus>(bus);
    } catch (const bus::Error&) {  // none is there
    }
}

Daemons::~Daemons() = default;

bool Daemons::runs(const std::string& busName, const std::string& unit) {
    const auto known = running_.find(busName);
    if (known != running_.end()) {
        return known->second;
    }
    bool found = unitHasProcesses(unit);
    try {
        found = found || (bus_ && bus_->hasOwner(busName));
    } catch (const bus::Error&) {  // the bus is gone
        bus_.reset();
    }
    running_[busName] = found;
    return found;
}

/// A link that it does not know is an error to it, and so is one that has gone meanwhile.
std::optional<ManagedLink> Daemons::networkManagerOn(const std::string& link) {
    if (const LostManager* lost = lostManager()) {
        return lost->on(link);
    }
    if (!runs(kService, "NetworkManager")) {
        return std::nullopt;
    }
    if (!bus_) {
        throw NoAnswer("NetworkManager runs, but the system's bus cannot be reached");
    }
    try {
        const bus::Message question =
            bus_->call({kService, "/org/freedesktop/NetworkManager", kService, "GetDeviceByIpIface"});
        bus::Writer(question).put(link);
        const bus::Message answer = bus_->ask(question, kService);
        return described(*bus_, bus::Reader(answer).path());
    } catch (const bus::Error& error) {
        if (error.name() == interfaceOf(".UnknownDevice")) {
            return std::nullopt;
        }
        throw NoAnswer(std::string("NetworkManager does not tell of it: ") + error.what());
    }
}

}  // namespace cvagent::keep
