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
    if (arguments.size() != 1 || *arguments.front() == '-') {
        return answer.leaveToHost(toolName, firstOf(arguments));
    }
    const std::string_view name = arguments.front();
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
