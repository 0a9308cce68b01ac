#include "agent/service/changes.h"

#include <chrono>
#include <utility>

#include "agent/bus/writer.h"
#include "agent/service/members.h"
#include "agent/service/names.h"
#include "agent/service/values.h"

namespace cvagent::service {

namespace {

/// Long enough that a cable's up and down is one signal, short enough that nobody notices.
constexpr std::chrono::milliseconds kMerging{20};
/// The bus takes a message in microseconds; one that leaves so many waiting does not keep up.
constexpr std::uint64_t kMostUnsent = 64;
constexpr std::size_t kMostUntold = 1024;

}  // namespace

void Changes::nodeAdded(const NodeView& node) {
    if (model_ == nullptr) {
        return;
    }
    added_.insert(node.id);
    changed_.erase(node.id);
    arm();
}

/// One that was never told needs no farewell.
void Changes::nodeRemoved(const NodeView& node) {
    changed_.erase(node.id);
    if (added_.erase(node.id) == 0 && model_ != nullptr) {
        gone_.emplace(node.object, node.interface);
        arm();
    }
}

void Changes::propertyChanged(const NodeView& node, const std::string& property) {
    if (model_ != nullptr && !added_.contains(node.id)) {
        changed_[node.id].own.insert(property);
        arm();
    }
}

void Changes::nodePropertyChanged(const NodeView& node, const char* property) {
    if (model_ != nullptr && !added_.contains(node.id)) {
        changed_[node.id].node.insert(property);
        arm();
    }
}

void Changes::happened(const Event& event) {
    events_.push_back(event);
    if (events_.size() > kMostUntold) {
        events_.pop_front();
    }
    arm();
}

void Changes::arm() {
    if (!timer_) {
        timer_ = loop_.after(kMerging, [this] {
            timer_.reset();
            if (connection_.unsent() >= kMostUnsent) {
                arm();
            } else {
                flush();
            }
        });
    }
}

void Changes::flush() {
    if (model_ != nullptr) {
        for (const auto& [object, interface] : std::exchange(gone_, {})) {
            tellRemoved({object, interface});
        }
        for (const std::uint32_t id : std::exchange(added_, {})) {
            if (const NodeView* node = model_->byId(id)) {
                tellAdded(*node);
            }
        }
        for (const auto& [id, changed] : std::exchange(changed_, {})) {
            if (const NodeView* node = model_->byId(id)) {
                tellChanged(*node, changed);
            }
        }
    }
    tellEvents();
}

void Changes::send(const bus::Message& signal) const {
    connection_.send(signal);
    if (sent_) {
        sent_();
    }
}

void Changes::tellEvents() {
    for (const Event& event : std::exchange(events_, {})) {
        const bus::Message signal = connection_.newSignal(kRootObject, kAgentInterface, "Event");
        bus::Writer writer(signal);
        putEvent(writer, event);
        send(signal);
    }
}

void Changes::tellAdded(const NodeView& node) const {
    const bus::Message signal =
        connection_.newSignal(kRootObject, "org.freedesktop.DBus.ObjectManager", "InterfacesAdded");
    bus::Writer writer(signal);
    writer.putPath(node.object);
    putInterfaces(writer, *model_, node, false);
    send(signal);
}

void Changes::tellRemoved(const Gone& gone) const {
    const bus::Message signal =
        connection_.newSignal(kRootObject, "org.freedesktop.DBus.ObjectManager", "InterfacesRemoved");
    bus::Writer writer(signal);
    writer.putPath(gone.object).put(std::vector<std::string>{kNodeInterface, gone.interface});
    send(signal);
}

void Changes::tellChanged(const NodeView& node, const Changed& changed) const {
    if (!changed.node.empty()) {
        tellNodeProperties(node, changed.node);
    }
    if (!changed.own.empty()) {
        tellOwnProperties(node, changed.own);
    }
}

void Changes::tellNodeProperties(const NodeView& node, const std::set<std::string>& names) const {
    const bus::Message signal =
        connection_.newSignal(node.object, "org.freedesktop.DBus.Properties", "PropertiesChanged");
    bus::Writer writer(signal);
    writer.put(kNodeInterface).array("{sv}", [&] {
        for (const std::string& name : names) {
            writer.entry("sv", [&] {
                writer.put(name);
                putNodeProperty(writer, *model_, node, name);
            });
        }
    });
    writer.put(std::vector<std::string>());
    send(signal);
}

void Changes::tellOwnProperties(const NodeView& node, const std::set<std::string>& names) const {
    const bus::Message signal =
        connection_.newSignal(node.object, "org.freedesktop.DBus.Properties", "PropertiesChanged");
    bus::Writer writer(signal);
    std::vector<std::string> untold;  // no longer known, or not for everybody
    writer.put(node.interface).array("{sv}", [&] {
        for (const std::string& name : names) {
            const Reading* reading = findByName(node, name);
            if (reading == nullptr || !isKnown(*reading) || isTrusted(*reading)) {
                untold.push_back(name);
                continue;
            }
            writer.entry("sv", [&] {
                writer.put(name);
                putProperty(writer, reading->value);
            });
        }
    });
    writer.put(untold);
    send(signal);
}

}  // namespace cvagent::service
