#include "hosttools/applet.h"
#include "hosttools/ethtool_calls.h"
#include "hosttools/ethtool_listing.h"

namespace hosttools {
namespace {

constexpr const char* toolName = "ethtool";
constexpr unsigned longestName = 127;
constexpr int nothingKnown = 75;

}  // namespace

int runEthtool(Arguments arguments, Host&, Answer& answer) {
    const std::string_view name = firstOf(arguments);
    const bool isAll = name == "*";  // to the tool itself it is no link's name, even where one is called so
    if (arguments.size() != 1 || name.starts_with('-') || isAll) {
        return answer.leaveToHost(toolName, name);
    }
    if (name.size() > longestName) {
        answer.errors.add("device name '").add(name).add("' longer than ").number(longestName);
        answer.errors.add(" characters\n");
        return 1;
    }
    LinkReplies replies;
    if (!askLink(name, replies)) return listLinkByCalls(name, answer);
    answer.errors = complaintsOf(replies);
    answer.out = listLink(replies);
    if (answer.out.size() > 0) return 0;
    answer.out.add("No data available\n");
    return nothingKnown;
}

}  // namespace hosttools
