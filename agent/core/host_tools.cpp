#include "agent/core/host_tools.h"

#include <unistd.h>

#include <algorithm>
#include <cstdlib>
#include <filesystem>
#include <string_view>

#include "agent/core/environment.h"
#include "agent/core/probe.h"
#include "agent/core/program_path.h"
#include "agent/shell/child.h"
#include "agent/shell/programs.h"
#include "agent/shell/runner.h"
#include "framework/qx/process_tree.h"

namespace cvagent {

namespace {

namespace fs = std::filesystem;

constexpr std::chrono::milliseconds kLongestProbe{3000};

struct Tool {
    const char* name;
    const char* package;
    const char* purpose;
    /// How to see whether it prints the classic format; null for tools whose format has not changed.
    const char* probeArgument = nullptr;
    bool (*classic)(bool succeeded, std::string_view output) = nullptr;
};

bool contains(std::string_view text, std::string_view part) {
    return text.find(part) != std::string_view::npos;
}

constexpr Tool kTools[] = {
    {"ifconfig", "net-tools", "IPv4 addresses, hardware addresses; bringing interfaces up and down", "lo",
     [](bool, std::string_view output) { return contains(output, "Link encap:"); }},
    {"route", "net-tools", "gateways", "-n",
     [](bool, std::string_view output) { return contains(output, "Kernel IP routing table"); }},
    // A host without disks has nothing to list; a usage error is no listing.
    {"fdisk", "fdisk", "drives and partitions", "-ls",
     [](bool succeeded, std::string_view output) {
         return succeeded || output.starts_with("Disk") || contains(output, "\nDisk ");
     }},
    {"ethtool", "ethtool", "speed, duplex, link state, Wake-on-LAN"},
    {"ip", "iproute2", "IPv6 addresses, IPv6 routes"},
    {"brctl", "bridge-utils", "bridges and their members"},
    {"hostname", "hostname", "host name and domain name"},
    {"egrep", "grep", "network interfaces"},
    {"awk", "mawk", "changes of disks, settings of interfaces"},
    {"md5sum", "coreutils", "noticing changes of disks"},
    {"sha1sum", "coreutils", "noticing changes of disks"},
    {"shutdown", "systemd-sysv", "power actions"},
};

bool isProgram(const std::string& path) {
    return access(path.c_str(), X_OK) == 0 && fs::is_regular_file(path);
}

/// The first program of that name on PATH.
std::string findOnPath(const std::string& name) {
    for (const std::string& directory : directoriesOnPath()) {
        std::string candidate = fs::path(directory) / name;
        if (!directory.empty() && isProgram(candidate)) {
            return candidate;
        }
    }
    return {};
}

ToolReport lookFor(const Tool& tool, const std::optional<std::string>& adapters) {
    ToolReport report{tool.name, tool.package, tool.purpose, findOnPath(tool.name), true, {}, false};
    if (adapters && tool.classic != nullptr) {
        const std::string adapter = *adapters + "/" + tool.name + "/" + tool.name;
        report.adapter = isProgram(adapter) ? adapter : "";
    }
    return report;
}

void probeFormats(std::vector<ToolReport>& reports) {
    std::vector<std::pair<std::size_t, Probe>> running;
    for (std::size_t i = 0; i < reports.size(); ++i) {
        const Tool& tool = kTools[i];
        if (tool.classic != nullptr && !reports[i].native.empty()) {
            running.emplace_back(i, Probe({reports[i].native, tool.probeArgument}));
        }
    }
    for (auto& [i, probe] : running) {
        const bool succeeded = probe.finish(kLongestProbe);
        reports[i].classic = kTools[i].classic(succeeded, probe.output());
    }
}

}  // namespace

std::optional<std::string> adapterDirectory() {
    const auto built = besideProgram({"../hosttools"}, "adapters");
    return built ? built : besideProgram({"../lib/corvista"}, "adapters");
}

std::vector<ToolReport> inspectHostTools(HostTools choice, Look look,
                                         const std::optional<std::string>& adapters) {
    std::vector<ToolReport> reports;
    for (const Tool& tool : kTools) {
        if (look == Look::everything || tool.classic != nullptr) {
            reports.push_back(lookFor(tool, adapters));
        }
    }
    if (choice == HostTools::automatic || look == Look::everything) {
        probeFormats(reports);
    }
    for (ToolReport& report : reports) {
        const bool wanted = choice == HostTools::classic ||
                            (choice == HostTools::automatic && (report.native.empty() || !report.classic));
        report.useAdapter = wanted && !report.adapter.empty();
    }
    return reports;
}

void setUpCommands(Commands commands) {
    shell::leaveAllToShell(commands == Commands::shell);
    QX::setKillWitness(shell::noteKill);
}

void putAdaptersFirst(const std::vector<ToolReport>& reports) {
    std::string path;
    for (const ToolReport& report : reports) {
        if (report.useAdapter) {
            path += fs::path(report.adapter).parent_path().string() + ":";
            shell::setHostTools(report.adapter);  // all of them are one program
        }
    }
    const char* hosts = std::getenv("PATH");
    setenv("PATH", (path + (hosts != nullptr ? hosts : "")).c_str(), 1);
}

}  // namespace cvagent
