// corvista-guard: takes a change of the host back when nobody confirms it. Nobody types this; cvagent starts
// it.
#include <syslog.h>
#include <unistd.h>

#include <algorithm>
#include <csignal>
#include <exception>
#include <string>
#include <string_view>
#include <vector>

#include "agent/guard/detach.h"
#include "agent/undo/taking_back.h"
#include "hosttools/text.h"

namespace {

using cvagent::undo::ChangeDirectory;
using cvagent::undo::kChangesPlace;

constexpr int kUsage = 2;
constexpr std::string_view kHelp =
    "Usage: corvista-guard [--detach] NUMBER\n"
    "       corvista-guard --after-start\n"
    "Takes a change of this host back when its time is over or who makes it has died. cvagent starts it.\n"
    "  --detach       In a session of its own, for hosts without systemd\n"
    "  --after-start  Take back what was not confirmed when the power was cut; only files\n"
    "  --help, --version\n";

/// To whoever has the standard error, as systemd has; otherwise to the system's log.
void tell(const std::vector<std::string>& sentences, bool isDetached) {
    for (const std::string& sentence : sentences) {
        if (isDetached) {
            syslog(LOG_DAEMON | LOG_WARNING, "%s", sentence.c_str());
        } else {
            hosttools::writeAll(STDERR_FILENO, sentence + '\n');
        }
    }
}

/// @param find gives the sentences
template <class Find>
int told(bool isDetached, Find find) {
    try {
        tell(find(), isDetached);
        return 0;
    } catch (const std::exception& error) {
        tell({std::string("corvista-guard: ") + error.what()}, isDetached);
        return 1;
    }
}

/// For systemd an end by such a signal is a good one, behind which it starts nothing again.
void failWhenAskedToEnd() {
    for (const int each : {SIGHUP, SIGINT, SIGTERM, SIGPIPE}) {
        static_cast<void>(std::signal(each, [](int) { _exit(1); }));
    }
}

int guard(unsigned number, bool isDetached) {
    if (!isDetached) {
        failWhenAskedToEnd();
    }
    cvagent::guard::stayWhenMemoryIsShort();
    return told(isDetached,
                [number] { return cvagent::undo::guardChange(ChangeDirectory(kChangesPlace, number)); });
}

int afterStart() {
    bool isWhole = true;
    const int status =
        told(false, [&isWhole] { return cvagent::undo::takeBackAfterStart(kChangesPlace, isWhole); });
    return isWhole ? status : 1;
}

int run(const std::vector<std::string_view>& words) {
    const bool isAlone = words.size() == 1;
    if (isAlone && words.front() == "--help") {
        hosttools::writeAll(STDOUT_FILENO, kHelp);
        return 0;
    }
    if (isAlone && words.front() == "--version") {
        hosttools::writeAll(STDOUT_FILENO, "corvista-guard " CORVISTA_VERSION "\n");
        return 0;
    }
    if (isAlone && words.front() == "--after-start") {
        return afterStart();
    }
    const bool detached = words.size() == 2 && words.front() == "--detach";
    const auto number = isAlone || detached ? cvagent::undo::changeNumber(words.back()) : std::nullopt;
    if (!number) {
        hosttools::writeAll(STDERR_FILENO, kHelp);
        return kUsage;
    }
    return detached ? cvagent::guard::runDetached([number] { return guard(*number, true); })
                    : guard(*number, false);
}

}  // namespace

int main(int count, char** words) {
    return run({words + 1, words + std::max(count, 1)});
}
