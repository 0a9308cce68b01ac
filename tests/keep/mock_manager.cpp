#include "tests/keep/mock_manager.h"

#include <poll.h>

#include <utility>

#include "agent/bus/reader.h"
#include "agent/bus/writer.h"

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

void MockManager::answer(const bus::Message& call) const {
    if (silent_) {
        return;
    }
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
