#pragma once

#include <string>
#include <vector>

namespace cvagent::keep {

/// What keeps something of the host's own, and not of an interface, over a restart.
struct HostKeeper {
    std::string setting;  ///< "host name", "time zone" or "name servers"
    std::string keeper;   ///< a system, or the file that is read at the start; "" where nothing keeps it
    std::string
        evidence;  ///< what tells it, or why nothing does, for people; it may hold names from the host
};

/// Of the host's name, its zone, its name servers and search domains. Looks at files and at what runs; asks
/// nobody. Any user.
std::vector<HostKeeper> hostKeepers();

}  // namespace cvagent::keep
