// The command line without a history.
#include "agent/cli/commands/commands.h"
#include "agent/cli/kept_events.h"

namespace cvagent {

std::shared_ptr<EventKeeper> eventKeeper() {
    return nullptr;
}

std::shared_ptr<ShownMarks> shownMarks() {
    return nullptr;
}

ExitStatus commands::history(const Options&) {
    throw Failure(ExitStatus::failed, "this cvagent was built without a history");
}

}  // namespace cvagent
