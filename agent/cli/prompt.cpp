#include "agent/cli/prompt.h"

#include <poll.h>
#include <unistd.h>

#include "agent/cli/failure.h"
#include "agent/cli/print.h"
#include "agent/core/signals.h"

namespace cvagent {

namespace {

/// The line that is typed, with its line break. Less at the end of input and when a signal comes.
std::string typedLine() {
    const OrderlyEnd waiting;
    std::string line;
    for (char typed = 0; typed != '\n' && StopSignals::received() == 0;) {
        pollfd ready[] = {{STDIN_FILENO, POLLIN, 0}, {StopSignals::descriptor(), POLLIN, 0}};
        if (poll(ready, 2, -1) < 0 || ready[0].revents == 0) {
            continue;
        }
        if (read(STDIN_FILENO, &typed, 1) != 1) {
            break;
        }
        line += typed;
    }
    return line;
}

}  // namespace

void confirm(const std::string& what) {
    if (isatty(STDIN_FILENO) != 1) {
        throw Failure(ExitStatus::usage, "this would " + what + " the host; add --yes to do it");
    }
    ask("This will " + what + " the host at once. Go on? [y/N] ");
    const std::string answer = typedLine();
    if (StopSignals::received() != 0) {
        ask("\n");
        throw Interrupted();
    }
    if (answer != "y\n" && answer != "Y\n" && answer != "yes\n") {
        throw Failure(ExitStatus::refused, "nothing was done");
    }
}

}  // namespace cvagent
