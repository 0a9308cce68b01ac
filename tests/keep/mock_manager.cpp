#include "tests/keep/mock_manager.h"

#include <poll.h>

#include <algorithm>
#include <utility>

#include "agent/bus/reader.h"
#include "agent/bus/writer.h"
#include "agent/keep/manager_settings.h"

namespace bus = cvagent::bus;

namespace {

constexpr const char* kManagerName = "org.freedesktop.NetworkManager";

void putVariant(bus::Writer& writer, const MockManager::Value& value) {
    if (const auto* flag = std::get_if<bool>(&value)) {
        writer.variant("b", [&] { writer.put(*flag); });
    } else if (const auto* number = std::get_if<std::uint32_t>(&value)) {
        writer.variant("u", [&] { writer.put(*number); });
    } else if (const auto* text = std::get_if<std::string>(&value)) {
        writer.variant("s", [&] { writer.put(*text); });
    } else {
        writer.variant("o", [&] { writer.putPath(std::get<MockManager::Path>(value).text); });
    }
}

}  // namespace

MockManager::MockManager(const std::string& address, std::map<std::string, std::string> devices,
                         Objects objects, bool silent)
    : devices_(std::move(devices)), objects_(std::move(objects)), silent_(silent) {
    thread_ = std::thread([this, address] { serve(address); });
    ready_.wait(false);
}

MockManager::MockManager(const std::string& address, std::map<std::string, std::string> devices,
                         Objects objects, Deeds deeds)
    : devices_(std::move(devices)), objects_(std::move(objects)), silent_(false), deeds_(std::move(deeds)) {
    thread_ = std::thread([this, address] { serve(address); });
    ready_.wait(false);
}

MockManager::~MockManager() {
    stopped_ = true;
    thread_.join();
}

void MockManager::serve(const std::string& address) {
    bus::Connection connection(address);
    const bus::Slot served = connection.serve("/", [this](const bus::Message& call) { answer(call); });
    connection.acquireName(kManagerName);
    ready_ = true;
    ready_.notify_all();
    while (!stopped_) {
        connection.process();
        pollfd ready{connection.descriptor(), connection.events(), 0};
        poll(&ready, 1, 20);
    }
}

std::vector<std::string> MockManager::calls() const {
    const std::lock_guard lock(guard_);
    return calls_;
}

std::map<std::string, std::string> MockManager::given() const {
    const std::lock_guard lock(guard_);
    return given_;
}

void MockManager::note(const std::string& call) {
    const std::lock_guard lock(guard_);
    calls_.push_back(call);
}

void MockManager::answer(const bus::Message& call) {
    if (silent_ || deeds_.silent.contains(call.member())) {
        return;
    }
    if (const auto error = deeds_.errors.find(call.member()); error != deeds_.errors.end()) {
        throw bus::Error(kManagerName + std::string(".Failed"), error->second);
    }
    const bool isDeed =
        call.interface() != "org.freedesktop.DBus.Properties" && call.member() != "GetDeviceByIpIface";
    isDeed ? answerDeed(call) : answerQuestion(call);
}

void MockManager::update(const bus::Message& call) {
    bus::Reader reader(call);
    reader.skip();
    note("Update2 " + call.path() + (reader.number() == 1 ? " to-disk" : " otherwise"));
    auto flat = cvagent::keep::flatSettings(call);
    for (auto& [name, value] : flat) {
        std::ranges::replace(value, '\0', ' ');
    }
    const std::lock_guard lock(guard_);
    given_ = std::move(flat);
    if (deeds_.takes) {
        updated_ = call;
    }
}

void MockManager::answerDeed(const bus::Message& call) {
    const bus::Message reply = call.reply();
    bus::Writer writer(reply);
    bus::Reader reader(call);
    if (call.member() == "GetSettings") {
        if (updated_) {
            [[maybe_unused]] const bus::Reader fromItsBeginning(updated_);
            sd_bus_message_copy(reply.get(), updated_.get(), 0);
        } else {
            deeds_.settings(writer);
        }
    } else if (call.member() == "GetSecrets") {
        const auto secrets = deeds_.secrets.find(reader.text());
        if (secrets == deeds_.secrets.end()) {
            throw bus::Error(kManagerName + std::string(".AgentManager.NoSecrets"), "no agents");
        }
        secrets->second(writer, static_cast<bool>(updated_));
    } else if (call.member() == "Update2") {
        update(call);
        deeds_.onUpdate();
        writer.array("{sv}", [] {});
    } else if (call.member() == "LoadConnections") {
        note("LoadConnections " + reader.texts().at(0));
        updated_ = {};
        writer.put(deeds_.loads).put(std::vector<std::string>());
    } else {
        note(call.member() + " " + call.path());
        deeds_.onReapply();
    }
    sd_bus_send(nullptr, reply.get(), nullptr);
}

void MockManager::answerQuestion(const bus::Message& call) {
    bus::Reader reader(call);
    if (call.member() == "GetDeviceByIpIface") {
        const auto device = devices_.find(reader.text());
        if (device == devices_.end()) {
            throw bus::Error(kManagerName + std::string(".UnknownDevice"), "no such device");
        }
        const bus::Message reply = call.reply();
        bus::Writer(reply).putPath(device->second);
        sd_bus_send(nullptr, reply.get(), nullptr);
        return;
    }
    reader.text();  // the interface of the property
    const auto value = objects_.find(call.path() + ' ' + reader.text());
    if (value == objects_.end()) {
        throw bus::Error(bus::kUnknownProperty, "no such property");
    }
    const bus::Message reply = call.reply();
    bus::Writer writer(reply);
    putVariant(writer, value->second);
    sd_bus_send(nullptr, reply.get(), nullptr);
}
