#pragma once

#include <sys/types.h>

#include <ctime>
#include <map>
#include <string>

namespace cvagent::undo {

/// Has systemd-networkd read its files anew.
inline constexpr const char* kNetworkdReload = "networkctl reload";

/// What systemd-networkd tells of its links. A reload has ended before it sets links up anew: it takes their
/// addresses and routes away first, also those that others have made.
class NetworkdLinks {
public:
    /// Looks at them, before a reload.
    /// @param link the number of the only one that counts; 0 for any
    explicit NetworkdLinks(unsigned link = 0);
    /// Waits until a link has been set up anew since then: it has the addresses and gateways of its file, and
    /// an address where that asks for DHCP. One without a carrier is not waited for.
    /// @return false when none begins to be within five seconds, or is ready within ten
    bool waitUntilSetUp() const;

private:
    /// It writes a file for each link anew whenever something has changed.
    struct File {
        ino_t number;
        timespec written;

        bool isSame(const File& other) const {
            return number == other.number && written.tv_sec == other.written.tv_sec &&
                   written.tv_nsec == other.written.tv_nsec;
        }
    };
    using Files = std::map<std::string, File>;
    Files files() const;
    bool isSetUp(bool& hasBegun) const;

    std::string only_;
    Files before_;
};

}  // namespace cvagent::undo
