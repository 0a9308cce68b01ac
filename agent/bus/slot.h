#pragma once

#include <systemd/sd-bus.h>

#include <memory>

namespace cvagent::bus {

/// A handler that is registered: it is called no more once this is gone. It may go inside of its own call.
class Slot {
public:
    Slot() = default;
    /// @param handler what the library calls into, kept alive for it
    Slot(sd_bus_slot* slot, std::shared_ptr<void> handler) : handler_(std::move(handler)), slot_(slot) {}

    explicit operator bool() const { return slot_ != nullptr; }
    void reset() { slot_.reset(); }

private:
    struct Unref {
        void operator()(sd_bus_slot* slot) const { sd_bus_slot_unref(slot); }
    };
    std::shared_ptr<void> handler_;
    std::unique_ptr<sd_bus_slot, Unref> slot_;  // goes first
};

}  // namespace cvagent::bus
