#pragma once

#include <string>
#include <vector>

#include "agent/cli/remote/service.h"
#include "agent/core/event.h"
#include "agent/core/host_tools.h"
#include "agent/core/node_ref.h"
#include "agent/core/reading.h"
#include "agent/keep/host_keepers.h"
#include "agent/keep/keeper.h"
#include "agent/verify/verify.h"

/// The program's JSON. Text that is no UTF-8 has its damaged bytes replaced. Each function returns a whole
/// document with a line break at its end.
namespace cvagent::json {

/// {"plugin": FILE, "nodes": [NODE...]}; of several plug-ins "plugins": [FILE...] stands behind the first
/// one.
/// @param readings what to show of each node
std::string tree(const std::vector<std::string>& plugins, const std::vector<NodeRef>& nodes,
                 const std::vector<std::vector<Reading>>& readings);
/// The same with what is stored in each node.
std::string tree(const std::vector<std::string>& plugins, const std::vector<NodeRef>& nodes);
/// {"id", "parent", "type", "class", "index", "path", "description", "status", "properties": {"108": {"name",
/// "kind", "value"}}}; a property whose read failed has "error" in place of "value". One of a plug-in that
/// brings its own catalogue has "unit", too, where it counts something.
std::string node(const IC::MutableNode& node, const std::vector<Reading>& readings);
/// {"id", "path", "property": {"id", "name", "old", "new"}}, both as in a node.
std::string change(const IC::MutableNode& node, const Reading& before, const Reading& after);
/// One line: {"time", "event", "path", ...}; with "number" when the agent has given one, "property":
/// {"id", "name", "before", "after"} when the event is about one, and "caller", "wanted" and "verdict" when
/// somebody has written it; "plan" when that change had one.
std::string event(const Event& event);
/// The same with the "boot" in which it happened.
std::string event(const Event& event, const std::string& boot);
/// [{"class", "type", "id", "name", "kind", "unit", "readable", "writable", "values", "accepts", "meaning"}];
/// of a plug-in that brings its own catalogue also "source" and "trusted"
std::string catalogue(const std::vector<const Property*>& rows);
/// The plug-ins that would be loaded, and in words why others would not.
struct PluginReport {
    std::vector<std::string> files;
    std::vector<std::string> leftOut;
};
/// Who keeps what over a restart.
struct KeeperReport {
    std::vector<keep::Keeper> interfaces;
    std::vector<keep::HostKeeper> host;
};
/// {"service": {"running", "problem", "version", "since", "looked", "consent"}, "plugins": [FILE...],
/// "leftOut": [TEXT...], "tools": [{"tool", "host", "classic", "adapter", "used", "package", "purpose"}],
/// "keepers": [{"interface", "keeper", "claims": [{"system", "evidence", "source"}], "unknown": [TEXT...]}],
/// "hostKeepers": [{"setting", "keeper", "evidence"}]}
std::string doctor(const remote::ServiceReport& service, const PluginReport& plugins,
                   const std::vector<ToolReport>& tools, const KeeperReport& keepers);
/// {"compared", "differences": [{"path", "property", "shown", "kernel", "why"}]}
std::string verdict(const verify::Result& result);

}  // namespace cvagent::json
