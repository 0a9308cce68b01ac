#pragma once

#include <map>
#include <memory>
#include <optional>
#include <set>
#include <stdexcept>
#include <string>

namespace cvagent::keep {

/// A daemon that should know has not answered.
class NoAnswer : public std::runtime_error {
public:
    using std::runtime_error::runtime_error;
};

/// What NetworkManager says of a link.
struct ManagedLink {
    bool isManaged = false;
    bool isExternal = false;  ///< it only shows what others have configured
    std::string connection;   ///< the name of what is active on it; "" for nothing
    std::string file;         ///< where that is kept; "" where it is not told

    // Its objects on the bus; the second is "" with nothing active.
    std::string device;
    std::string profile;
};

/// The daemons of this host: which of them run, and what they say on the system's bus. No daemon is started
/// by a question. One thread.
class Daemons {
public:
    /// @param bus "system" or a bus's address. A bus that is not there is none of the problems: then what
    /// needs
    ///            one does not run.
    explicit Daemons(const std::string& bus = "system");
    Daemons(const Daemons&) = delete;
    Daemons& operator=(const Daemons&) = delete;
    ~Daemons();

    /// Whether a daemon has its name on the bus, or processes in the control group of its systemd unit.
    bool runs(const std::string& busName, const std::string& unit);
    /// Nothing where NetworkManager does not run or knows no such link. Throws NoAnswer.
    std::optional<ManagedLink> networkManagerOn(const std::string& link);

private:
    struct Bus;
    std::unique_ptr<Bus> bus_;
    std::map<std::string, bool> running_;
};

}  // namespace cvagent::keep
