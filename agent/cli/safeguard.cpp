#include "agent/cli/safeguard.h"

#include <unistd.h>

#include <algorithm>
#include <cmath>
#include <sstream>

#include "agent/change/guarding.h"
#include "agent/change/kept.h"
#include "agent/cli/caller.h"
#include "agent/cli/print.h"
#include "agent/core/host_file.h"

namespace cvagent {

namespace {

using change::MeantChange;

constexpr double kUsualSeconds = 60;
constexpr double kThousand = 1000;
/// A write of the service goes on when who asked for it has died; its commands are ended after ten seconds
/// each.
constexpr std::uint64_t kServiceSettles = 20'000;
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

std::string summaryOf(const std::vector<MeantChange>& changes) {
    const std::string more =
        changes.size() == 1 ? "" : " and " + std::to_string(changes.size() - 1) + " more";
    return changes.front().target() + more;
}

std::string secondsText(double seconds) {
    const long whole = std::lround(seconds);
    return std::to_string(whole) + (whole == 1 ? " second" : " seconds");
}

}  // namespace

std::optional<double> confirmSeconds(const Options& options, const std::vector<MeantChange>& changes) {
    if (options.confirmSeconds) {
        return *options.confirmSeconds > 0 ? options.confirmSeconds : std::nullopt;
    }
    const bool isPerson = geteuid() == 0 && isTyped();
    const bool isRisky = std::ranges::any_of(changes, canCutOff) && std::ranges::none_of(changes, stopsHost);
    return isPerson && isRisky ? std::optional(kUsualSeconds) : std::nullopt;
}

void ChangeSafeguard::begin(const std::vector<MeantChange>& changes,
                            const std::vector<change::FileChange>& planned) {
    seconds_ = confirmSeconds(options_, changes);
    if (geteuid() != 0) {
        if (seconds_) {
            throw Failure(ExitStatus::failed,
                          "only root can have a change taken back; nothing was done\nRun: sudo cvagent");
        }
        return;
    }
    try {
        open(changes, planned);
    } catch (const undo::ChangeError& error) {
        making_.reset();
        if (seconds_ && options_.confirmSeconds) {
            throw Failure(ExitStatus::failed, std::string("the change cannot be guarded: ") +
                                                  printable(error.what()) + "\nNothing was done");
        }
        seconds_.reset();
        complain(std::string("the change cannot be taken back later: ") + printable(error.what()));
    }
}

void ChangeSafeguard::open(const std::vector<MeantChange>& changes,
                           const std::vector<change::FileChange>& planned) {
    undo::MakingSettings settings;
    settings.place = change::changesPlace();
    settings.caller = callerName();
    settings.summary = summaryOf(changes);
    settings.paths = change::touchedPaths(planned);
    settings.calls = change::keeperCallsFor(changes);
    settings.paths.insert(settings.paths.end(), settings.calls.files.begin(), settings.calls.files.end());
    settings.steps = changes.size();
    settings.window = seconds_ ? static_cast<std::uint64_t>(std::ceil(*seconds_ * kThousand)) : 0;
    settings.settling = options_.byService ? kServiceSettles : 0;
    making_.emplace(settings);
    if (seconds_) {
        change::startGuard(making_->directory());
    }
}

void ChangeSafeguard::beginStep() {
    if (!making_) {
        return;
    }
    try {
        making_->beginStep();
    } catch (const undo::ChangeError& error) {
        throw Failure(ExitStatus::failed, printable(error.what()));
    }
}

bool ChangeSafeguard::end(bool hasFailed) {
    if (!making_) {
        return false;
    }
    try {
        if (hasFailed && seconds_) {
            return isTakenBack();
        }
        tellMade();
    } catch (const undo::ChangeError& error) {
        tellUnwritten(hasFailed, printable(error.what()));
    }
    return false;
}

/// The guard takes for left what has no end in its journal.
void ChangeSafeguard::tellUnwritten(bool hasFailed, const std::string& reason) const {
    if (!seconds_) {
        complain("the change cannot be taken back later: " + reason);
        return;
    }
    const std::string text =
        "change " + std::to_string(making_->number()) + " is taken back by its guard: " + reason;
    if (!hasFailed) {
        throw Failure(ExitStatus::failed, text);
    }
    complain(text);
}

void ChangeSafeguard::tellMade() {
    const undo::Journal journal = making_->end();
    const std::string number = "change " + std::to_string(making_->number());
    if (journal.stage == undo::Stage::made) {
        complain(number + " is taken back in " + secondsText(*seconds_) +
                 " unless somebody types: cvagent confirm " + std::to_string(making_->number()));
    } else if (journal.stage != undo::Stage::kept) {
        throw Failure(ExitStatus::failed, number + " " + undo::stageText(journal.stage) +
                                              ": its time was over before all was written");
    }
}

bool ChangeSafeguard::isTakenBack() {
    const undo::Journal journal = making_->takeBack();
    complain("change " + std::to_string(making_->number()) + " " + undo::stageText(journal.stage) +
             notesOf(journal));
    return journal.stage == undo::Stage::takenBack;
}

std::string notesOf(const undo::Journal& journal) {
    std::string text;
    for (const std::string& note : journal.notes) {
        text += "\n" + printable(note);
    }
    return text;
}

}  // namespace cvagent
