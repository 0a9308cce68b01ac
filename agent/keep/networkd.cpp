#include <sys/stat.h>

#include <algorithm>
#include <array>
#include <filesystem>
#include <iterator>
#include <map>

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

/// What is added to a file by others, as systemd-networkd reads it: by name, one for all of the same name.
std::vector<std::string> dropInsOf(const std::string& source) {
    std::map<std::string, std::string> found;
    for (const char* place : kPlaces) {
        const std::string directory = place + lastPart(source) + ".d/";
        for (const std::string& name : hosttools::listDirectory(directory)) {
            if (name.ends_with(".conf")) {
                found.emplace(name, directory + name);
            }
        }
    }
    std::vector<std::string> paths;
    std::ranges::transform(found, std::back_inserter(paths), [](const auto& each) { return each.second; });
    return paths;
}

bool isAsOpenAs(const std::string& path, const std::string& other) {
    struct stat one {};
    struct stat two {};
    return stat(path.c_str(), &one) == 0 && stat(other.c_str(), &two) == 0 && one.st_mode == two.st_mode &&
           one.st_uid == two.st_uid && one.st_gid == two.st_gid;
}

bool isMasked(const std::string& path) {
    std::error_code unknown;
    return std::filesystem::canonical(path, unknown) == "/dev/null";
}

/// In front of a file behind another one: none of its lines belong to the other one's last section.
constexpr const char* kNoSection = "\n[X-Added]\n";

/// The file with what is added to it, for a file of another name gets nothing of that.
/// @param own the path of ours, to which all would be added once more
std::string wholeOf(const std::string& source, const std::string& own) {
    auto text = smallFile(source);
    if (!text) {
        throw CannotKeep("cannot read " + inQuotes(source));
    }
    for (const std::string& path : dropInsOf(source)) {
        const auto added = isMasked(path) ? "" : smallFile(path);
        if (!added) {
            throw CannotKeep("cannot read " + inQuotes(path));
        }
        if (source == own) {
            throw CannotKeep(inQuotes(path) + " adds to the file of the interface, which is ours");
        }
        if (!added->empty() && !isAsOpenAs(path, source)) {
            throw CannotKeep(inQuotes(path) + " has another owner or mode than the file of the interface");
        }
        *text += kNoSection + *added;
    }
    return *text;
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
    const std::string path = ownNetworkPath(claim.source, link.name);
    const std::string source = wholeOf(claim.source, path);
    std::string content = ownNetworkFile(source, link.name, wish);
    const bool isKeptAlready = content == ownNetworkFile(source, link.name, Wish{});
    const auto before = smallFile(path);
    return {claim.system,
            {},
            {{path, before, isKeptAlready ? before : std::optional(std::move(content)), claim.source}},
            {"networkctl reload"}};
}

}  // namespace cvagent::keep
