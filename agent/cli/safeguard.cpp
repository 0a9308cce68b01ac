#include "agent/cli/safeguard.h"

#include <unistd.h>

#include <algorithm>
#include <sstream>
#include <string>

#include "agent/core/host_file.h"

namespace cvagent {

namespace {

using change::MeantChange;

constexpr double kUsualSeconds = 60;
/// Address, mask, both of IPv6, gateways, the interface's state: who has come by that interface is gone.
constexpr unsigned int kCutOff[] = {24, 25, 26, 27, 100, 101, 102, 123};

/// After a new start nobody would know whom to ask.
bool stopsHost(const MeantChange& change) {
    return change.drastic() != nullptr;
}

bool canCutOff(const MeantChange& change) {
    return change.row->type == NodeType::ipConfig &&
           std::ranges::find(kCutOff, change.row->id) != std::end(kCutOff);
}

bool isSudo(pid_t process) {
    const auto name = cvagent::contentOf("/proc/" + std::to_string(process) + "/comm");
    return name == "sudo\n" || name == "doas\n";
}

/// @param process whose name has no blanks
pid_t parentOf(pid_t process) {
    std::istringstream words(cvagent::contentOf("/proc/" + std::to_string(process) + "/stat").value_or(""));
    std::string skipped;
    pid_t parent = 0;
    words >> skipped >> skipped >> skipped >> parent;
    return parent;
}

/// A shell gives each command that is typed a process group of its own, and none to those of a script. sudo
/// gives what it runs one in any case, so that it is sudo that counts.
bool isTyped() {
    pid_t command = getpid();
    for (pid_t above = getppid(); isSudo(above); above = parentOf(above)) {
        command = above;
    }
    return isatty(STDIN_FILENO) == 1 && getpgid(command) == command;
}

}  // namespace

std::optional<double> confirmSeconds(const Options& options, const std::vector<MeantChange>& changes) {
    if (options.confirmSeconds) {
        return *options.confirmSeconds > 0 ? options.confirmSeconds : std::nullopt;
    }
    const bool isPerson = (geteuid() == 0 || options.byService) && isTyped();
    const bool isRisky = std::ranges::any_of(changes, canCutOff) && std::ranges::none_of(changes, stopsHost);
    return isPerson && isRisky ? std::optional(kUsualSeconds) : std::nullopt;
}

}  // namespace cvagent
