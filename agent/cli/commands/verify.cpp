#include "agent/verify/verify.h"
#include "agent/cli/commands/commands.h"
#include "agent/cli/json.h"
#include "agent/cli/print.h"

namespace cvagent::commands {

namespace {

std::string report(const verify::Result& result, const Style& style) {
    const std::string head =
        "Compared " + std::to_string(result.compared) + " facts of the tree with the kernel: ";
    if (result.differences.empty()) {
        return head + style.good("none differs") + ".\n";
    }
    std::string text = head + style.bad(std::to_string(result.differences.size()) + " differ") + ".\n";
    for (const verify::Difference& each : result.differences) {
        text += style.strong(printable(each.path)) + "  " + each.property + "\n    shown   " +
                printable(each.shown) + "\n    kernel  " + printable(each.kernel) + "\n    why     " +
                printable(each.why) + "\n";
    }
    return text;
}

}  // namespace

ExitStatus verifyTree(Session& session, const Options& options) {
    const Request request = ownRequest();
    const Session::Tree tree = session.tree(request);
    const verify::Result result = verify::verify(tree.nodes, tree.readings);
    print(options.json ? json::verdict(result) : report(result, Style::detect()));
    session.showErrors(request);
    return result.differences.empty() ? ExitStatus::done : ExitStatus::failed;
}

}  // namespace cvagent::commands
