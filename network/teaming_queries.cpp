#include "network/teaming_queries.h"

#include <dirent.h>
#include <unistd.h>

#include <algorithm>
#include <memory>

#include "mi/command.h"
#include "mi/line_file.h"
#include "mi/log.h"
#include "mi/text.h"
#include "network/bonding_status.h"
#include "network/interface_file.h"

namespace IC {

namespace {

constexpr char kBonding[] = "/proc/net/bonding";

/// The same path as in the commands below: of a team called "/etc/x", too, it stays below the directory.
std::string statusFile(const std::string& team) {
    return std::string(kBonding) + '/' + team;
}

/// The first line a command prints, without its line break; "" when it prints none.
std::string answer(const Command& command) {
    return trimEnd(firstLine(command).line.value_or(""));
}

/// What `cut` has left of a line behind its colon, without the blanks before it.
std::string behindColon(const std::string& line) {
    return trimStart(trimEnd(line));
}

/// The name of the team in a MASTER value: in its file it may stand in quotes, and blanks around it are
/// nothing to the shell that reads the file.
std::string teamOf(const std::string& master) {
    constexpr char kAround[] = " \t'\"";
    const auto first = std::min(master.find_first_not_of(kAround), master.size());
    return master.substr(first, master.find_last_not_of(kAround) + 1 - first);
}

std::string roleValue(const std::string& port, const char* key) {
    return trimEnd(interfaceFileValue(port, key).value_or(""));
}

std::string activeMember(const std::string& team, const std::string& port) {
    if (access(statusFile(team).c_str(), F_OK) != 0) {
        return "";
    }
    // The search for eth1 also finds eth10: while eth10 is active, both ports say so. Readers have always
    // been told this.
    return answer(formatCommand(
        "cat /proc/net/bonding/%s 2> /dev/null | grep -i \"Currently Active Slave: %s\" 2> /dev/null", team,
        port));
}

/// The member's section, read without a tool. A `grep` that works line by line, as most do, can never match
/// the two-line patterns of the commands below.
parse::BondingMember sectionOf(const std::string& team, const std::string& port) {
    const LineFile file = LineFile::read(statusFile(team)).value_or(LineFile());
    return parse::bondingMember(file.lines(), port).value_or(parse::BondingMember());
}

std::string miiStatus(const std::string& team, const std::string& port) {
    std::string status = answer(
        formatCommand("cat /proc/net/bonding/%s 2> /dev/null | grep -P \"Slave Interface: %s\\nMII Status\" "
                      "2> /dev/null | grep \"MII Status: \" 2> /dev/null | cut -d' ' -f3 2> /dev/null",
                      team, port));
    return status.empty() ? sectionOf(team, port).miiStatus : status;
}

std::string linkFailures(const std::string& team, const std::string& port, const std::string& status) {
    std::string count =
        answer(formatCommand("cat /proc/net/bonding/%s 2> /dev/null | grep -P \"Slave Interface: %s\\nMII "
                             "Status: %s\\n\" 2> /dev/null "
                             "| grep \"Link Failure Count: \" 2> /dev/null | cut -d ' ' -f4 2> /dev/null",
                             team, port, status));
    if (!count.empty()) {
        return count;
    }
    // The command looks for a section with this status; a member whose status has changed since has none.
    const parse::BondingMember section = sectionOf(team, port);
    return section.miiStatus == status ? section.linkFailures : "";
}

}  // namespace

bool getNICTeams(std::vector<std::string>& teams) {
    const LogScope scope("Entering getNICTeams", "Exiting getNICTeams");
    const std::unique_ptr<DIR, int (*)(DIR*)> directory(opendir(kBonding), closedir);
    if (directory == nullptr) {
        return false;
    }
    while (const dirent* entry = readdir(directory.get())) {
        const std::string name = entry->d_name;
        if (!name.starts_with('.') && !name.ends_with('~')) {
            teams.push_back(name);
        }
    }
    return true;
}

bool getBondingMode(std::string team, std::string& mode) {
    const LogScope scope("Entering getBondingMode", "Exiting getBondingMode");
    mode.clear();
    const FirstLine first = firstLine(formatCommand(
        "cat /proc/net/bonding/%s 2> /dev/null | grep \"Bonding Mode: \" | cut -d ':' -f2 2> /dev/null",
        team));
    if (first.line) {
        mode = behindColon(*first.line);
    }
    return first.line.has_value();
}

bool getBondingMembers(std::string team, std::vector<std::string>& members) {
    const LogScope scope("Entering getBondingMembers", "Exiting getBondingMembers");
    HostCommand listing(formatCommand(
        "cat /proc/net/bonding/%s 2> /dev/null | grep \"Slave Interface: \" | cut -d ':' -f2 2> /dev/null",
        team));
    bool any = false;
    while (const auto line = listing.nextLine()) {
        members.push_back(behindColon(*line));
        any = true;
    }
    return any;
}

void getNICTeamingInformation(std::string const& port, unsigned int id, std::string& result,
                              std::string& master) {
    const LogScope scope("Entering getNICTeamingInformation", "Exiting getNICTeamingInformation");
    switch (id) {
        case TeamingProperty::role:
            result = roleValue(port, "SLAVE");
            master = roleValue(port, "MASTER");
            break;
        case TeamingProperty::activeMember:
            result = activeMember(teamOf(master), port);
            break;
        case TeamingProperty::miiStatus:
            result = miiStatus(teamOf(master), port);
            break;
        case TeamingProperty::linkFailures: {
            std::string status;
            getNICTeamingInformation(port, TeamingProperty::miiStatus, status, master);
            result = linkFailures(teamOf(master), port, status);
            break;
        }
        default:
            break;
    }
}

}  // namespace IC
