#pragma once

#include <string>
#include <vector>

namespace cvagent::keep {

/// A link as the kernel has it.
struct Link {
    std::string name;
    unsigned index = 0;
};

/// That a system keeps the configuration of an interface, as what runs tells it.
struct Claim {
    std::string system;    ///< "NetworkManager", "netplan", "systemd-networkd", "wicked" or "ifupdown"
    std::string evidence;  ///< what tells it, for people; it may hold names from the host
    std::string source;    ///< the file that the configuration comes from; "" where none is told
};

/// Who keeps the configuration of an interface over a restart. Nobody without a claim. Where there are
/// several it is not known whose word would hold, so none of them is asked to keep anything.
struct Keeper {
    std::string interface;
    std::vector<Claim> claims;
    std::vector<std::string> unknown;  ///< what could not be found out, in words: who has not answered

    /// The one that keeps it; "" for nobody, for several, and where somebody has not answered.
    std::string system() const { return claims.size() == 1 && unknown.empty() ? claims[0].system : ""; }
};

/// Of one link; see keepers().
Keeper keeperOf(const Link& link);

/// Asks what runs on this host, in this order: NetworkManager, systemd-networkd (netplan where that has made
/// what they keep), wicked, ifupdown. Nothing is changed and no daemon is started by the question; a daemon
/// that does not answer is waited for two seconds, all in all. Any user.
/// @return one for each link but the loopback, in the order of their names; none where the kernel tells no
/// links
std::vector<Keeper> keepers();

}  // namespace cvagent::keep
