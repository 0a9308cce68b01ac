#include "agent/core/host_tools.h"

#include <unistd.h>

#include <algorithm>
#include <cstdlib>
#include <filesystem>
#include <string_view>

#include "agent/core/environment.h"
#include "agent/core/probe.h"
#include "agent/core/program_path.h"
#include "agent/shell/adapters.h"
#include "agent/shell/child.h"
#include "agent/shell/programs.h"
#include "agent/shell/runner.h"
#include "framework/qx/process_tree.h"

namespace cvagent {

namespace {

namespace fs = std::filesystem;

constexpr std::chrono::milliseconds kLongestProbe{3000};
/// Finds the interfaces by their names.
constexpr const char* kListingTool = "egrep";

enum class Adapter { none, exists };

/// How to see whether a tool gives what the plug-in's commands understand.
struct Format {
    const char* probeArgument = nullptr;
    bool (*classic)(bool succeeded, std::string_view output) = nullptr;
};

struct Tool {
    const char* name;
    const char* package;
    const char* purpose;
    /// The properties, by their names, and the nodes that are not known without it.
    const char* costs;
    Adapter adapter = Adapter::none;
    /// Empty for tools whose format has not changed.
    Format format = {};
};

bool contains(std::string_view text, std::string_view part) {
    return text.find(part) != std::string_view::npos;
}

constexpr Tool kTools[] = {
    {"ifconfig",
     "net-tools",
     "IPv4 addresses, hardware addresses; bringing interfaces up and down",
     "IPv4Address, SubnetMask, IPOrigin, TeamName",
     Adapter::exists,
     {"lo", [](bool, std::string_view output) { return contains(output, "Link encap:"); }}},
    {"route",
     "net-tools",
     "gateways",
     "IPv4Gateway, IPv6Gateway",
     Adapter::exists,
     {"-n", [](bool, std::string_view output) { return contains(output, "Kernel IP routing table"); }}},
    // A host without disks has nothing to list; a usage error is no listing.
    {"fdisk",
     "fdisk",
     "drives and partitions",
     "hard-drive, partition",
     Adapter::exists,
     {"-ls",
      [](bool succeeded, std::string_view output) {
          return succeeded || output.starts_with("Disk") || contains(output, "\nDisk ");
      }}},
    {"ethtool", "ethtool", "speed, duplex, link state, Wake-on-LAN",
     "LinkSpeed, SupportedSpeed, FullDuplex, AutoNegotiation, PortType, LinkState, InterfaceState, "
     "WakeOnLanSupported, WakeOnLanEnabled",
     Adapter::exists},
    {"brctl", "bridge-utils", "bridges and their members", "", Adapter::exists},
    {kListingTool, "grep", "network interfaces", "network-port, ip-config, team", Adapter::exists},
    {"ip", "iproute2", "IPv6 addresses, IPv6 routes",
     "IPv6Address, IPv6PrefixLength, IPv6InterfaceId, IPv6AddressType"},
    {"hostname", "hostname", "host name and domain name", "HostName, DomainName"},
    {"awk", "mawk", "changes of disks, settings of interfaces", "IPOrigin, IPv4Gateway"},
    {"md5sum", "coreutils", "noticing changes of disks", ""},
    {"sha1sum", "coreutils", "noticing changes of disks", ""},
    {"shutdown", "systemd-sysv", "power actions", "PowerAction"},
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
    ToolReport report;
    report.tool = tool.name;
    report.package = tool.package;
    report.purpose = tool.purpose;
    report.native = findOnPath(tool.name);
    if (adapters && tool.adapter == Adapter::exists) {
        const std::string adapter = *adapters + "/" + tool.name + "/" + tool.name;
        report.adapter = isProgram(adapter) ? adapter : "";
    }
    return report;
}

void setClassic(ToolReport& report, bool classic, const char* flaw) {
    report.classic = classic;
    report.flaw = classic ? "" : flaw;
}

void probeFormats(std::vector<ToolReport>& reports) {
    std::vector<std::pair<std::size_t, Probe>> running;
    for (std::size_t i = 0; i < reports.size(); ++i) {
        const Tool& tool = kTools[i];
        if (tool.format.classic != nullptr && !reports[i].native.empty()) {
            running.emplace_back(i, Probe({reports[i].native, tool.format.probeArgument}));
        }
        if (reports[i].tool == kListingTool && !reports[i].native.empty()) {
            setClassic(reports[i], shell::haveClassicNames(),
                       "finds no interfaces with names such as enp3s0");
        }
    }
    for (auto& [i, probe] : running) {
        const bool succeeded = probe.finish(kLongestProbe);
        setClassic(reports[i], kTools[i].format.classic(succeeded, probe.output()), "not the classic format");
    }
}

}  // namespace

std::optional<std::string> adapterDirectory() {
    const auto built = besideProgram({"../hosttools"}, "adapters");
    return built ? built : besideProgram({"../lib/corvista", "."}, "adapters");
}

std::vector<ToolReport> inspectHostTools(HostTools choice, Look look,
                                         const std::optional<std::string>& adapters) {
    std::vector<ToolReport> reports;
    for (const Tool& tool : kTools) {
        if (look == Look::everything || tool.adapter == Adapter::exists) {
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
        report.standsBy = choice != HostTools::native && !report.adapter.empty() && !report.useAdapter;
    }
    return reports;
}

bool MissingTool::costsProperty(const std::string& name) const {
    return (", " + costs + ",").find(", " + name + ",") != std::string::npos;
}

std::vector<MissingTool> missingTools() {
    std::vector<MissingTool> missing;
    for (const Tool& tool : kTools) {
        if (*tool.costs != '\0' && findOnPath(tool.name).empty()) {
            missing.push_back({tool.name, tool.package, tool.costs});
        }
    }
    return missing;
}

void setUpCommands(Commands commands) {
    shell::leaveAllToShell(commands == Commands::shell);
    QX::setKillCallBack(shell::noteKill);
}

void findLinksOfAnyName(std::vector<ToolReport>& reports) {
    for (ToolReport& report : reports) {
        if (report.tool == kListingTool && !report.adapter.empty()) {
            report.useAdapter = true;
            report.standsBy = false;
        }
    }
}

void putAdaptersOnPath(const std::vector<ToolReport>& reports) {
    const char* const hosts = std::getenv("PATH");
    std::string front;
    std::string path = hosts != nullptr ? hosts : "";
    for (const ToolReport& report : reports) {
        const std::string directory = fs::path(report.adapter).parent_path();
        if (report.useAdapter) {
            front += directory + ":";
        } else if (report.standsBy) {
            path += (path.empty() ? "" : ":") + directory;
        }
        if (report.useAdapter || report.standsBy) {
            shell::setHostTools(report.adapter);  // all of them are one program
        }
    }
    setenv("PATH", (front + path).c_str(), 1);
}

}  // namespace cvagent
