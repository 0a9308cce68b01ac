#include <algorithm>
#include <filesystem>

#include "agent/core/text.h"
#include "agent/keep/daemons.h"
#include "agent/keep/host_files.h"
#include "agent/keep/interfaces_file.h"
#include "agent/keep/stanza_editor.h"
#include "agent/keep/systems.h"
#include "agent/keep/way.h"

namespace cvagent::keep {

namespace {

/// Its notes of what it has set up: "eth0=home".
constexpr const char* kState = "/run/network/ifstate";

std::string logicalNameOf(const std::string& link) {
    const std::string name = assigned(smallFile(kState).value_or(""), link);
    return name.substr(0, name.find_first_of(" \t"));
}

/// @param family "" for any
bool hasStanza(const std::string& file, const std::string& name, const std::string& family = {}) {
    return std::ranges::any_of(stanzasIn(splitLines(smallFile(file).value_or(""))), [&](const Stanza& each) {
        return each.name == name && (family.empty() || each.family == family);
    });
}

/// The files that have one, without links on the way, so that a link stays one.
/// @param family "" for any
std::vector<std::string> filesOfStanzas(const std::string& name, const std::string& family = {}) {
    std::vector<std::string> files = interfacesFiles();
    std::erase_if(files, [&](const std::string& file) { return !hasStanza(file, name, family); });
    std::error_code unknown;
    for (std::string& file : files) {
        file = std::filesystem::canonical(file, unknown).string();
    }
    return files;
}

std::string fileOfStanza(const std::string& name, const std::string& family) {
    const std::vector<std::string> files = filesOfStanzas(name, family);
    if (files.size() != 1) {
        throw CannotKeep((files.empty() ? "no file has a" : "more than one file has a") +
                         std::string(" stanza of ") + inQuotes(name) + " for " + family);
    }
    return files[0];
}

/// The part of a wish that stands in the stanza of one family.
Wish partOf(const Wish& wish, bool isIpv6) {
    Wish part;
    (isIpv6 ? part.ipv6 : part.ipv4) = isIpv6 ? wish.ipv6 : wish.ipv4;
    if (!isIpv6) {
        part.dhcp = wish.dhcp;
        part.nameServers = wish.nameServers;
        part.searchDomains = wish.searchDomains;
    }
    return part;
}

FileEdit& editOf(const std::string& path, std::vector<FileEdit>& files) {
    const auto known = std::ranges::find(files, path, &FileEdit::path);
    if (known != files.end()) {
        return *known;
    }
    const auto content = smallFile(path);
    return files.emplace_back(FileEdit{path, content, content});
}

}  // namespace

/// It is no daemon: its word is what it has noted of its last doing.
std::optional<Claim> claimOfIfupdown(const Link& link, Daemons& /*daemons*/) {
    const std::string name = logicalNameOf(link.name);
    if (name.empty()) {
        return std::nullopt;
    }
    for (const std::string& file : interfacesFiles()) {
        if (hasStanza(file, name)) {
            return Claim{"ifupdown", "ifupdown has it up as '" + name + "', by the stanza in " + file, file};
        }
    }
    return std::nullopt;
}

/// It takes an interface down by what its files say, so it has to before they are changed.
Way wayOfIfupdown(const Link& link, const Claim& claim, const Wish& wish) {
    const std::string name = logicalNameOf(link.name);
    checkName(name);
    Way way{claim.system, {"ifdown " + link.name}, {}, {}};
    way.callsAfter = {"ifup " + link.name + (name == link.name ? "" : "=" + name)};
    for (const std::string& file : wish.isEmpty() ? filesOfStanzas(name) : std::vector<std::string>()) {
        editOf(file, way.files);
    }
    for (const bool isIpv6 : {false, true}) {
        const Wish part = partOf(wish, isIpv6);
        if (!part.isEmpty()) {
            FileEdit& edit = editOf(fileOfStanza(name, isIpv6 ? "inet6" : "inet"), way.files);
            edit.after = editedStanza(edit.after.value_or(""), name, part);
        }
    }
    return way;
}

}  // namespace cvagent::keep
