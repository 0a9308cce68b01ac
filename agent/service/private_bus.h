#pragma once

#include <sys/types.h>

#include <optional>
#include <string>

#include "agent/core/data_directory.h"

namespace cvagent::service {

/// A bus of our own, for hosts without a system bus: dbus-daemon with a configuration of ours, which limits
/// what one reader may leave waiting. It ends with this object and with this process, however that ends. To
/// be made before there are threads and before /tmp becomes another one.
class PrivateBus {
public:
    /// @param directory where its socket lies; made where it is missing, and held. Throws Problem.
    explicit PrivateBus(const std::string& directory);
    PrivateBus(const PrivateBus&) = delete;
    PrivateBus& operator=(const PrivateBus&) = delete;
    ~PrivateBus();

    /// "unix:path=/run/corvista/bus"
    const std::string& address() const { return address_; }
    /// Where it lies when nobody says: root's or the user's own place for what runs.
    static std::string standardDirectory();

private:
    void takeDirectory(const std::string& directory);
    void start(const std::string& config);
    void waitForAddress(int pipe);

    std::optional<HeldDirectory> directory_;
    int place_ = -1;  // the directory, whatever is mounted over it later
    pid_t daemon_ = -1;
    std::string address_;
};

/// Its configuration.
std::string privateBusConfig(const std::string& socket, uid_t owner);

}  // namespace cvagent::service
