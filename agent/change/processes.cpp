#include "agent/change/processes.h"

#include <linux/netlink.h>
#include <linux/rtnetlink.h>
#include <unistd.h>

#include <algorithm>
#include <array>
#include <filesystem>
#include <sstream>

#include "agent/core/host_file.h"
#include "agent/core/text.h"
#include "framework/qx/whole_number.h"

namespace cvagent::change {

namespace {

constexpr std::array kKeepers = {"NetworkManager", "systemd-network", "wickedd", "connmand", "dhclient",
                                 "dhcpcd",         "netplan",         "ifplugd", "udhcpc"};

bool isKeeper(const Process& process) {
    return std::ranges::find(kKeepers, process.name) != kKeepers.end();
}

bool hearsOfAddresses(unsigned long groups) {
    constexpr unsigned long kGroups =
        RTMGRP_IPV4_IFADDR | RTMGRP_IPV4_ROUTE | RTMGRP_IPV6_IFADDR | RTMGRP_IPV6_ROUTE | RTMGRP_LINK;
    return (groups & kGroups) != 0;
}

}  // namespace

std::vector<Process> runningProcesses() {
    std::vector<Process> found;
    std::error_code problem;
    for (std::filesystem::directory_iterator at("/proc", problem), end; !problem && at != end;
         at.increment(problem)) {
        const auto id = QX::wholeNumber<pid_t>(at->path().filename().native());
        const auto name = id ? contentOf(at->path().native() + "/comm") : std::nullopt;
        if (name) {
            found.push_back({*id, name->substr(0, name->find('\n'))});
        }
    }
    return found;
}

/// A socket has the id of its process, unless that holds several.
std::vector<std::string> listenersToAddresses() {
    std::istringstream lines(contentOf("/proc/net/netlink").value_or(""));
    std::vector<Process> found;
    for (std::string line; std::getline(lines, line);) {
        std::istringstream words(line);
        std::string socket;
        int protocol = -1;
        long long port = 0;
        unsigned long groups = 0;
        if (words >> socket >> protocol >> port >> std::hex >> groups && protocol == NETLINK_ROUTE &&
            hearsOfAddresses(groups) && port > 0 && port != getpid()) {
            const auto name = contentOf("/proc/" + std::to_string(port) + "/comm");
            if (name) {
                found.push_back({static_cast<pid_t>(port), name->substr(0, name->find('\n'))});
            }
        }
    }
    std::stable_partition(found.begin(), found.end(), isKeeper);
    std::vector<std::string> names;
    for (const Process& each : found) {
        const std::string name = printable(each.name) + " (pid " + std::to_string(each.id) + ")";
        if (std::ranges::find(names, name) == names.end()) {
            names.push_back(name);
        }
    }
    return names;
}

}  // namespace cvagent::change
