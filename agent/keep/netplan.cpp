#include <algorithm>
#include <array>

#include "agent/core/text.h"
#include "agent/keep/host_files.h"
#include "agent/keep/netplan_file.h"
#include "agent/keep/way.h"
#include "hosttools/files.h"

namespace cvagent::keep {

namespace {

constexpr std::array kDirectories = {"/lib/netplan/", "/etc/netplan/", "/run/netplan/"};

/// The name under which netplan has the interface, as the file tells that it has made for its renderer:
/// "10-netplan-ID.network", "netplan-ID.nmconnection".
std::string idIn(const std::string& made) {
    const std::string name = lastPart(made);
    for (const auto& [start, end] : {std::pair{"10-netplan-", ".network"}, {"netplan-", ".nmconnection"}}) {
        const std::size_t length = std::string(start).size() + std::string(end).size();
        if (name.starts_with(start) && name.ends_with(end) && name.size() > length) {
            return name.substr(std::string(start).size(), name.size() - length);
        }
    }
    throw CannotKeep("netplan's name of the interface is not in " + inQuotes(made));
}

/// What is done with a file; why it cannot be names the file, too.
template <class Act>
auto doneWith(const std::string& path, const Act& act) {
    const auto content = smallFile(path);
    if (!content) {
        throw CannotKeep("cannot read " + inQuotes(path));
    }
    try {
        return act(*content);
    } catch (const CannotKeep& cannot) {
        throw CannotKeep(inQuotes(path) + ": " + cannot.what());
    }
}

/// The one file that defines it: of several, each may say a part of it.
std::string fileThatDefines(const std::string& id) {
    std::string found;
    for (const char* directory : kDirectories) {
        std::vector<std::string> names = hosttools::listDirectory(directory);
        std::ranges::sort(names);
        for (const std::string& name : names) {
            const std::string path = directory + name;
            const auto defines = [&id](const std::string& text) { return definesInNetplan(text, id); };
            if (!name.ends_with(".yaml") || !doneWith(path, defines)) {
                continue;
            }
            if (!found.empty()) {
                throw CannotKeep(inQuotes(found) + " and " + inQuotes(path) + " both define " + inQuotes(id));
            }
            found = path;
        }
    }
    if (!found.starts_with("/etc/")) {
        throw CannotKeep("no file in /etc/netplan defines " + inQuotes(id));
    }
    return found;
}

}  // namespace

/// What netplan makes for its renderer is made anew, and the renderer told.
Way wayOfNetplan(const Link& link, const Claim& claim, const Wish& wish) {
    const std::string id = idIn(claim.source);
    const std::string path = fileThatDefines(id);
    const auto edit = [&](const std::string& text) {
        return FileEdit{path, text, editedNetplan(text, id, wish)};
    };
    Way way{claim.system, {}, {doneWith(path, edit)}, {}};
    way.callsAfter = {"netplan generate"};
    if (claim.source.starts_with("/run/systemd/")) {
        way.callsAfter.emplace_back("networkctl reload");
    } else {
        way.callsAfter.emplace_back("nmcli connection reload");
        way.callsAfter.emplace_back("nmcli device reapply " + link.name);
    }
    return way;
}

}  // namespace cvagent::keep
