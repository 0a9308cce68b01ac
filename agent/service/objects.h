#pragma once

#include <cstdint>
#include <string>
#include <vector>

#include "agent/service/calls.h"

namespace cvagent::service {

/// What the agent's own object tells of itself besides the nodes.
struct Standing {
    std::string version;
    std::uint64_t startedAt = 0;  ///< microseconds since 1970
    std::uint64_t lookedAt = 0;
    std::uint64_t lastEvent = 0;
};

/// Answers the calls for the agent's object and those below it: one handler for all of them, whatever number
/// of nodes there are. The loop's thread.
class Objects {
public:
    /// All outlive it.
    Objects(Parts& parts, const Standing& standing) : parts_(parts), standing_(standing) {}

    /// From now on calls are answered.
    void serve();
    /// How many calls have come.
    std::uint64_t handled() const { return handled_; }
    /// The methods that the tables know, as "interface member signature", for who compares them with what the
    /// interface file says.
    static std::vector<std::string> methods();

private:
    friend struct ObjectsOfTest;
    void handle(const bus::Message& message);

    Parts& parts_;
    const Standing& standing_;
    std::uint64_t handled_ = 0;
    bus::Slot slot_;
};

}  // namespace cvagent::service
