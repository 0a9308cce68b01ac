#include <filesystem>
#include <set>

#include "agent/cli/commands/commands.h"
#include "agent/cli/json.h"
#include "agent/cli/print.h"
#include "agent/cli/remote/service.h"
#include "agent/core/catalogue_file.h"
#include "agent/core/host_tools.h"
#include "agent/core/plugin_files.h"
#include "agent/core/signals.h"

namespace cvagent::commands {

namespace {

std::string found(const ToolReport& report) {
    if (report.native.empty()) {
        return "not found";
    }
    return report.native + (report.classic ? "" : " (" + report.flaw + ")");
}

std::string outcome(const ToolReport& report, const Style& style) {
    if (report.useAdapter) {
        return style.good("our adapter ") + report.adapter;
    }
    if (report.missing()) {
        return style.bad("missing: ") + report.purpose + "; install the package " +
               style.strong(report.package);
    }
    return report.classic ? style.good("the host's own")
                          : style.bad("the host's own, not understood: ") + report.purpose;
}

std::string advice(const std::vector<ToolReport>& reports) {
    std::set<std::string> packages;
    for (const ToolReport& report : reports) {
        if (report.missing()) {
            packages.insert(report.package);
        }
    }
    std::string text;
    for (const std::string& package : packages) {
        text += " " + package;
    }
    return text.empty() ? "Nothing is missing: no package needs to be installed.\n"
                        : "To install what is missing: apt-get install" + text + "\n";
}

/// Which adapters stand in, and which of them answer only while a tool of the host is away.
std::string adaptersInUse(const std::vector<ToolReport>& reports) {
    std::string inUse;
    std::string standBy;
    for (const ToolReport& report : reports) {
        (report.useAdapter ? inUse : standBy) +=
            report.useAdapter || report.standsBy ? " " + report.tool : "";
    }
    return (inUse.empty() ? "" : "Our adapters stand in for:" + inUse + "\n") +
           (standBy.empty() ? ""
                            : "Our adapters stand by, should the host's own be removed:" + standBy + "\n");
}

std::string table(const std::vector<ToolReport>& reports, const Style& style) {
    std::size_t width = 0;
    for (const ToolReport& report : reports) {
        width = std::max(width, found(report).size());
    }
    std::string text = style.strong(padded("TOOL", 10) + padded("FOUND", width + 2) + "USED") + "\n";
    for (const ToolReport& report : reports) {
        text += padded(report.tool, 10) + padded(found(report), width + 2) + outcome(report, style) + "\n";
    }
    return text + "\n" + adaptersInUse(reports) + advice(reports);
}

std::string pluginLine(const std::string& file, const Style& style) {
    const bool named = std::filesystem::is_regular_file(catalogueFileOf(file));
    return "  " + printable(file) + (named ? style.faint("  with names of its own") : "") + "\n";
}

/// They are looked at, not loaded.
json::PluginReport findPlugins(const Options& options) {
    PluginFiles found{options.plugins, {}};
    json::PluginReport report;
    try {
        if (options.plugins.empty()) {
            found = pluginsBesideProgram();
        }
    } catch (const Problem& problem) {
        report.leftOut.emplace_back(problem.what());
    }
    report.files = found.files;
    for (const LeftOut& one : found.leftOut) {
        report.leftOut.emplace_back(one.problem.what());
    }
    return report;
}

std::string pluginLines(const json::PluginReport& report, const Style& style) {
    std::string text = style.strong("PLUG-INS") + "\n";
    for (const std::string& file : report.files) {
        text += pluginLine(file, style);
    }
    for (const std::string& why : report.leftOut) {
        text += "  " + style.bad(printable(why)) + "\n";
    }
    return text + "\n";
}

constexpr const char* kNobody = "nobody: what is changed holds until restart";

std::string keeperOf(const keep::Keeper& keeper, const Style& style) {
    if (keeper.claims.empty() && keeper.unknown.empty()) {
        return kNobody;
    }
    const std::string system = keeper.system();
    return system.empty() ? style.bad(keeper.claims.size() > 1 ? "more than one" : "not known")
                          : style.good(system);
}

/// A line of the table, and what it is told by.
struct KeeperRow {
    std::string name;
    std::string keeper;
    std::vector<std::string> evidence;
};

KeeperRow rowOf(const keep::Keeper& keeper, const Style& style) {
    KeeperRow row{printable(keeper.interface), keeperOf(keeper, style), {}};
    for (const keep::Claim& claim : keeper.claims) {
        row.evidence.push_back(printable(claim.evidence));
    }
    for (const std::string& why : keeper.unknown) {
        row.evidence.push_back(style.bad(printable(why)));
    }
    return row;
}

KeeperRow rowOf(const keep::HostKeeper& keeper, const Style& style) {
    return {keeper.setting,
            keeper.keeper.empty() ? kNobody : style.good(keeper.keeper),
            {printable(keeper.evidence)}};
}

std::string keeperLines(const json::KeeperReport& report, const Style& style) {
    std::vector<KeeperRow> rows;
    for (const keep::Keeper& each : report.interfaces) {
        rows.push_back(rowOf(each, style));
    }
    for (const keep::HostKeeper& each : report.host) {
        rows.push_back(rowOf(each, style));
    }
    std::size_t width = 0;
    for (const KeeperRow& row : rows) {
        width = std::max(width, row.name.size());
    }
    std::string text = style.strong("KEPT OVER A RESTART BY") + "\n";
    for (const KeeperRow& row : rows) {
        text += "  " + padded(row.name, width + 2) + row.keeper + "\n";
        for (const std::string& each : row.evidence) {
            text += "    " + each + "\n";
        }
    }
    return text + "\n";
}

const char* consentText(const std::string& consent) {
    return consent == "polkit" ? "whom polkit lets" : "root and the group corvista";
}

std::string serviceLines(const remote::ServiceReport& report, const Style& style) {
    const std::string head = style.strong("SERVICE") + "\n  ";
    if (!report.problem.empty()) {
        return head + printable(report.problem) + "\n\n";
    }
    return head + style.good("running") + ", version " + printable(report.version) + "\n  since " +
           report.since + ", last full look " + report.looked + "\n  read by everybody, written by " +
           consentText(report.consent) + "\n\n";
}

}  // namespace

ExitStatus doctor(const Options& options, const remote::ServiceReport& service) {
    const Style style = Style::detect();
    StopSignals::install();
    const std::vector<ToolReport> reports =
        inspectHostTools(options.hostTools, Look::everything, adapterDirectory());
    const json::PluginReport plugins = findPlugins(options);
    const json::KeeperReport keepers{keep::keepers(), keep::hostKeepers()};
    print(options.json ? json::doctor(service, plugins, reports, keepers)
                       : serviceLines(service, style) + pluginLines(plugins, style) +
                             keeperLines(keepers, style) + table(reports, style));
    return ExitStatus::done;
}

}  // namespace cvagent::commands
