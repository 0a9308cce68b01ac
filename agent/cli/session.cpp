#include "agent/cli/session.h"

#include "agent/cli/print.h"

namespace cvagent {

Session::NodeReadings Session::findAndRead(const std::string& word,
                                           const std::vector<std::string>& properties,
                                           const Request& request) {
    NodeReadings found{find(word), {}};
    found.readings = read(found.node, properties, request);
    return found;
}

void showLines(ErrorLines& errors) {
    const ErrorLines::Taken taken = errors.take();
    for (const std::string& text : taken.texts) {
        complain("the plug-in reports: " + text);
    }
    if (taken.lost > 0) {
        complain("the plug-in reports: and " + std::to_string(taken.lost) +
                 " more; --log FILE keeps them all");
    }
}

Request ownRequest() {
    return Request("the command line");
}

}  // namespace cvagent
