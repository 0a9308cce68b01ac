#include "agent/core/text.h"
#include "agent/keep/daemons.h"
#include "agent/keep/host_files.h"
#include "agent/keep/manager.h"
#include "agent/keep/systems.h"
#include "agent/keep/way.h"

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

/// It writes its file itself. The calls are for the program that takes a change back, which knows no bus.
Way wayOfNetworkManager(const Link& link, const Claim& claim, const Wish& wish) {
    const ManagerProfile profile = profileOn(link.name);
    const auto content = smallFile(profile.file);
    Way way{claim.system,
            {},
            {{profile.file, content, content}},
            {"nmcli connection reload", "nmcli device reapply " + link.name}};
    const ProfileIp wanted = editedProfile(profile.ip, wish);
    if (wanted == profile.ip) {
        return way;
    }
    const std::string words = joinedWords(differencesOf(profile.ip, wanted), ", ");
    way.request = {{"NetworkManager Update2 " + inQuotes(profile.id) + ": " + words,
                    "NetworkManager Reapply " + link.name},
                   [link, profile, wanted] { updateProfile(link.name, profile, wanted); },
                   [link] { rereadProfile(link.name); }};
    return way;
}

}  // namespace cvagent::keep
