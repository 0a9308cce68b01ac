#include <algorithm>

#include "agent/keep/daemons.h"
#include "agent/keep/host_files.h"
#include "agent/keep/interfaces_file.h"
#include "agent/keep/systems.h"

namespace cvagent::keep {

namespace {

/// Its notes of what it has set up: "eth0=home".
constexpr const char* kState = "/run/network/ifstate";

std::string logicalNameOf(const std::string& link) {
    const std::string name = assigned(smallFile(kState).value_or(""), link);
    return name.substr(0, name.find_first_of(" \t"));
}

bool hasStanza(const std::string& file, const std::string& name) {
    const auto stanzas = stanzasIn(splitLines(smallFile(file).value_or("")));
    return std::ranges::find(stanzas, name, &Stanza::name) != stanzas.end();
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

}  // namespace cvagent::keep
