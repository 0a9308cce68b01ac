#pragma once

#include <cstdint>
#include <deque>
#include <functional>
#include <map>
#include <set>
#include <string>
#include <utility>

#include "agent/bus/connection.h"
#include "agent/core/event.h"
#include "agent/service/loop.h"
#include "agent/service/model.h"

namespace cvagent::service {

/// Tells the bus what has become different: of each node once for all that changed within a short time, and
/// only while the bus takes what it was told before. What waits is bounded by the number of nodes; of events
/// the oldest go. The loop's thread.
class Changes : public ModelListener {
public:
    /// Both outlive it.
    Changes(bus::Connection& connection, Loop& loop) : connection_(connection), loop_(loop) {}

    /// @param sent called for each signal
    void whenSent(std::function<void()> sent) { sent_ = std::move(sent); }
    /// @param model outlives it; it is the one that tells the changes
    void begin(const Model& model) { model_ = &model; }

    void nodeAdded(const NodeView& node) override;
    void nodeRemoved(const NodeView& node) override;
    void propertyChanged(const NodeView& node, const std::string& property) override;
    void nodePropertyChanged(const NodeView& node, const char* property) override;
    void happened(const Event& event);

    /// Everything that waits, now.
    void flush();

private:
    struct Changed {
        std::set<std::string> own;   // of the class's interface
        std::set<std::string> node;  // of the node's
    };
    struct Gone {
        std::string object;
        std::string interface;
    };

    void arm();
    void send(const bus::Message& signal) const;
    void tellEvents();
    void tellAdded(const NodeView& node) const;
    void tellRemoved(const Gone& gone) const;
    void tellChanged(const NodeView& node, const Changed& changed) const;
    void tellNodeProperties(const NodeView& node, const std::set<std::string>& names) const;
    void tellOwnProperties(const NodeView& node, const std::set<std::string>& names) const;

    bus::Connection& connection_;
    Loop& loop_;
    std::function<void()> sent_;
    const Model* model_ = nullptr;  // null until the service is ready: nobody knows anything yet
    std::set<std::uint32_t> added_;
    std::map<std::string, std::string> gone_;  // objects that were told, and the interfaces of their classes
    std::map<std::uint32_t, Changed> changed_;
    std::deque<Event> events_;
    Loop::Source timer_;
};

}  // namespace cvagent::service
