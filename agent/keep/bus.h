#pragma once

#include <chrono>
#include <set>
#include <string>

#include "agent/bus/connection.h"

namespace cvagent::keep {

/// A connection whose every answer is waited for only so long. Who has let a question time out is not asked
/// again.
class PatientBus {
public:
    static constexpr std::chrono::seconds kLongest{2};

    /// Throws bus::Error.
    explicit PatientBus(const std::string& address) : connection_(address) {}

    bool hasOwner(const std::string& name);
    /// A call that starts no daemon.
    bus::Message call(const bus::Target& target) const;
    /// @return the answer; throws bus::Error for one that is an error, NoAnswer when there is none in time
    bus::Message ask(const bus::Message& call, const std::string& service,
                     std::chrono::seconds longest = kLongest);

    // A property of an object. Each throws as ask() does, and bus::Error when it is of another type.
    bool flag(const bus::Target& property);
    std::uint32_t number(const bus::Target& property);
    std::string path(const bus::Target& property);
    std::string text(const bus::Target& property);

private:
    template <class Take>
    void take(const bus::Target& property, const Take& take);

    bus::Connection connection_;
    std::set<std::string> silent_;
};

}  // namespace cvagent::keep
