#pragma once

#include <cstdint>
#include <functional>
#include <list>
#include <map>
#include <string>
#include <vector>

#include "agent/bus/connection.h"

namespace cvagent::service {

/// Who calls, as the bus knows it from the connection's socket; nothing that the caller says himself.
struct Caller {
    std::string name;  ///< of the connection, ":1.23"; never given twice
    std::uint32_t user = 0;
    std::vector<std::uint32_t> groups;

    bool isIn(std::uint32_t group) const;
};

/// Asks the bus who a connection belongs to, and remembers the last of them. The loop's thread.
class Callers {
public:
    /// Gets null when the bus does not tell, as of one who has gone.
    using Found = std::function<void(const Caller*)>;

    /// @param connection outlives it
    explicit Callers(bus::Connection& connection) : connection_(connection) {}

    /// Calls back at once when it is known, else when the bus has answered.
    /// @return false, and nothing is done, when too many wait for the same one already
    bool find(const std::string& name, Found found);

private:
    struct Asked {
        bus::Slot slot;
        std::vector<Found> waiting;
    };

    void ask(const std::string& name);
    void answered(const std::string& name, const bus::Message& answer);
    void remember(const Caller& caller);

    bus::Connection& connection_;
    std::map<std::string, Caller> known_;
    std::list<std::string> oldestFirst_;  // of the known ones
    std::map<std::string, Asked> asked_;
};

}  // namespace cvagent::service
