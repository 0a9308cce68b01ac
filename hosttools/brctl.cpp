#include <sys/stat.h>
#include <algorithm>
#include <string>
#include <vector>

#include "hosttools/applet.h"
#include "hosttools/files.h"

namespace hosttools {
namespace {

constexpr const char* toolName = "brctl";
constexpr const char* sysfs = "/sys/class/net/";

std::vector<std::string> sortedNames(const std::string& directory) {
    std::vector<std::string> names = listDirectory(directory);
    std::ranges::sort(names);
    return names;
}

bool isBridge(const std::string& name) {
    struct stat directory {};
    return stat((sysfs + name + "/bridge").c_str(), &directory) == 0 && S_ISDIR(directory.st_mode);
}

void list(Text& text, const std::string& bridge) {
    const std::string directory = sysfs + bridge;
    const bool spanningTree = readNumber(directory + "/bridge/stp_state") != 0;
    text.add(bridge).add("\t\t").add(readFirstLine(directory + "/bridge/bridge_id"));
    text.add(spanningTree ? "\tyes\t\t" : "\tno\t\t");
    const char* before = "";
    for (const std::string& member : sortedNames(directory + "/brif")) {
        text.add(before).add(member);
        before = "\n\t\t\t\t\t\t\t";
    }
    text.add('\n');
}

}  // namespace

int runBrctl(Arguments arguments, Host&, Answer& answer) {
    if (arguments.size() != 1 || std::string_view(arguments.front()) != "show") {
        return answer.leaveToHost(toolName,
                                  firstOf(arguments) == "show" ? arguments.back() : firstOf(arguments));
    }
    for (const std::string& name : sortedNames(sysfs)) {
        if (!isBridge(name)) continue;
        if (answer.out.size() == 0) answer.out.add("bridge name\tbridge id\t\tSTP enabled\tinterfaces\n");
        list(answer.out, name);
    }
    return 0;
}

}  // namespace hosttools
