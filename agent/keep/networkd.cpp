#include <algorithm>
#include <array>

#include "agent/core/text.h"
#include "agent/keep/daemons.h"
#include "agent/keep/host_files.h"
#include "agent/keep/network_file.h"
#include "agent/keep/systems.h"
#include "agent/keep/way.h"
#include "hosttools/files.h"

namespace cvagent::keep {

namespace {

/// What it says of links that it leaves alone, or has not looked at.
constexpr std::array kNotKept = {"", "unmanaged", "pending", "initialized"};

constexpr std::array kPlaces = {"/etc/systemd/network/", "/run/systemd/network/",
                                "/usr/local/lib/systemd/network/", "/usr/lib/systemd/network/",
                                "/lib/systemd/network/"};

/// Its word is that of a user with few rights, and what it names is copied.
bool isInItsPlaces(const std::string& file) {
    return std::ranges::any_of(kPlaces, [&file](const std::string& place) {
        return file == place + lastPart(file) && file.ends_with(".network");
    });
}

/// What is added to a file by others, and would not be to one of another name.
std::string dropInOf(const std::string& source) {
    for (const char* place : kPlaces) {
        const std::string directory = place + lastPart(source) + ".d";
        for (const std::string& name : hosttools::listDirectory(directory)) {
            if (name.ends_with(".conf")) {
                return directory + "/" + name;
            }
        }
    }
    return "";
}

bool isGeneratedFromNetplan(const std::string& file) {
    return file.starts_with("/run/systemd/network/") && lastPart(file).starts_with("10-netplan-");
}

}  // namespace

/// Its state files outlive it, so it has to run, too.
std::optional<Claim> claimOfNetworkd(const Link& link, Daemons& daemons) {
    const auto told = smallFile("/run/systemd/netif/links/" + std::to_string(link.index));
    const std::string state = assigned(told.value_or(""), "ADMIN_STATE");
    const std::string file = assigned(told.value_or(""), "NETWORK_FILE");
    for (const char* other : kNotKept) {
        if (state == other) {
            return std::nullopt;
        }
    }
    if (file.empty() || !daemons.runs("org.freedesktop.network1", "systemd-networkd")) {
        return std::nullopt;
    }
    const bool isGenerated = isGeneratedFromNetplan(file);
    return Claim{
        isGenerated ? "netplan" : "systemd-networkd",
        "systemd-networkd says '" + state + "', by " + file + (isGenerated ? " that netplan has made" : ""),
        file};
}

/// A reload has it look at its files again, and set up anew the links whose file is another one now.
Way wayOfNetworkd(const Link& link, const Claim& claim, const Wish& wish) {
    if (!isInItsPlaces(claim.source)) {
        throw CannotKeep(inQuotes(claim.source) + " is no file of systemd-networkd's");
    }
    const auto source = smallFile(claim.source);
    if (!source) {
        throw CannotKeep("cannot read " + inQuotes(claim.source));
    }
    if (const std::string dropIn = dropInOf(claim.source); !dropIn.empty()) {
        throw CannotKeep(inQuotes(dropIn) + " adds to the file of the interface");
    }
    const std::string path = ownNetworkPath(claim.source, link.name);
    std::string content = ownNetworkFile(*source, link.name, wish);
    const bool isKeptAlready = content == ownNetworkFile(*source, link.name, Wish{});
    const auto before = smallFile(path);
    return {claim.system,
            {},
            {{path, before, isKeptAlready ? before : std::optional(std::move(content)), claim.source}},
            {"networkctl reload"}};
}

}  // namespace cvagent::keep
