#include "agent/keep/daemons.h"
#include "agent/keep/host_files.h"
#include "agent/keep/systems.h"

namespace cvagent::keep {

std::optional<Claim> claimOfNetworkManager(const Link& link, Daemons& daemons) {
    const auto told = daemons.networkManagerOn(link.name);
    if (!told || !told->isManaged || told->isExternal) {
        return std::nullopt;
    }
    if (told->connection.empty()) {
        return Claim{"NetworkManager", "NetworkManager manages it, with no connection active", ""};
    }
    const bool isGenerated = lastPart(told->file).starts_with("netplan-");
    return Claim{isGenerated ? "netplan" : "NetworkManager",
                 "NetworkManager manages it, with the connection '" + told->connection + "'" +
                     (isGenerated ? " that netplan has made" : ""),
                 told->file};
}

}  // namespace cvagent::keep
