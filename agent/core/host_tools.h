#pragma once

#include <optional>
#include <string>
#include <vector>

namespace cvagent {

/// Which tools the plug-in's commands find: the host's own, the adapters, or of each the one that speaks the
/// classic format.
enum class HostTools { automatic, native, classic };

/// How the plug-in's commands are run: without a shell where that is safe, or all of them by /bin/sh.
enum class Commands { direct, shell };

/// Has the commands of this process run so. Without the call they are run directly, but the end of one by its
/// deadline looks like any other. To be called once, before there are threads.
void setUpCommands(Commands commands);

/// What is known of one tool that the plug-in's commands run.
struct ToolReport {
    std::string tool;
    std::string package;  ///< the Debian package to install for the host's own
    std::string purpose;  ///< what is not known without it
    std::string native;   ///< path of the host's own; empty when it is missing
    bool classic = true;  ///< the host's own gives what the plug-in's commands understand
    std::string flaw;     ///< what it gives instead, when it does not
    std::string adapter;  ///< path of our adapter; empty when there is none
    bool useAdapter = false;
    bool standsBy = false;  ///< the adapter is to answer while the host's own is away

    bool missing() const { return native.empty() && !useAdapter; }
    /// What the plug-in's commands will run; empty when there is nothing.
    std::string used() const { return useAdapter ? adapter : native; }
};

/// Which tools to look at: those that adapters exist for, which is quick, or all.
enum class Look { adapters, everything };

/// Looks for the tools on PATH. Those that there are adapters for are run once, side by side, to see which
/// format they print; they are asked for what changes nothing. Forced choices run nothing.
/// @param adapters where the adapters are; nothing when there are none
std::vector<ToolReport> inspectHostTools(HostTools choice, Look look,
                                         const std::optional<std::string>& adapters);

/// Has the adapter stand in that finds links of any name, also on a host whose links have classic ones: it
/// finds the same there.
void findLinksOfAnyName(std::vector<ToolReport>& reports);

/// Puts the directories of the adapters that are to be used in front of PATH. Those that stand by come at its
/// very end: a tool can vanish for a moment while the program runs, when its package is upgraded.
void putAdaptersOnPath(const std::vector<ToolReport>& reports);

/// A tool that the plug-in's commands do not find, not even as an adapter.
struct MissingTool {
    std::string tool;
    std::string package;
    std::string costs;  ///< the properties, by their names, and nodes that are not known without it

    bool costsProperty(const std::string& name) const;
};
/// As PATH is now. The tools without which nothing is missing that a node shows are left out.
std::vector<MissingTool> missingTools();

/// Where the adapters are, in the build tree or installed, each in a directory of its own name; nothing when
/// they are not.
std::optional<std::string> adapterDirectory();

}  // namespace cvagent
