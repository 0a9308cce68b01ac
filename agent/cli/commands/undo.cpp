// What becomes of changes that were made: confirm, rollback, history --changes.
#include <unistd.h>

#include <cmath>
#include <ctime>
#include <nlohmann/json.hpp>

#include "agent/change/revocable.h"
#include "agent/cli/commands/commands.h"
#include "agent/cli/print.h"
#include "agent/cli/remote/service.h"
#include "agent/core/signals.h"
#include "agent/undo/making.h"

namespace cvagent::commands {

namespace {

using Json = nlohmann::ordered_json;
using undo::ChangeDirectory;
using undo::ChangeError;
using undo::Journal;
using undo::kChangesPlace;

constexpr double kThousand = 1000;

bool isRoot() {
    return geteuid() == 0;
}

/// @param command as it was typed
[[noreturn]] void mustBeRoot(const std::string& command) {
    throw Failure(ExitStatus::failed,
                  "only root keeps and takes back changes of the host\nRun: sudo cvagent " + command);
}

unsigned numberIn(const std::string& word) {
    const auto number = undo::changeNumber(word);
    if (!number) {
        throw Failure(ExitStatus::usage, inQuotes(word) + " is no number of a change");
    }
    return *number;
}

ChangeDirectory numbered(unsigned number) {
    try {
        return {kChangesPlace, number};
    } catch (const ChangeError& error) {
        throw Failure(ExitStatus::notFound,
                      std::string(error.what()) + "\nThe changes are listed by: cvagent history --changes");
    }
}

std::string timeText(std::uint64_t seconds) {
    const auto time = static_cast<std::time_t>(seconds);
    std::tm parts{};
    char text[32] = "";
    gmtime_r(&time, &parts);
    static_cast<void>(std::strftime(text, sizeof text, "%Y-%m-%dT%H:%M:%SZ", &parts));
    return text;
}

/// Of a change whose agent has ended before it nobody writes how it ended.
std::string stageOf(const ChangeDirectory& change, const Journal& journal) {
    const bool isLeft =
        journal.stage == undo::Stage::changing && !journal.isOpen() && !change.isTaken(undo::kAgentLock);
    return isLeft ? "was broken off" : undo::stageText(journal.stage);
}

/// @return a line, and one for each thing that is not back
std::string linesOf(const ChangeDirectory& change, const Journal& journal) {
    std::string text = padded(std::to_string(change.number()), 6) + timeText(journal.began) + "  " +
                       padded(stageOf(change, journal), 28) + printable(journal.summary) + "  (by " +
                       printable(journal.caller) + ")\n";
    for (const std::string& note : journal.notes) {
        text += "      " + printable(note) + "\n";
    }
    return text;
}

Json objectOf(const ChangeDirectory& change, const Journal& journal) {
    return {{"change", change.number()},
            {"time", timeText(journal.began)},
            {"stage", stageOf(change, journal)},
            {"summary", journal.summary},
            {"by", journal.caller},
            {"notes", journal.notes}};
}

void confirmHere(const Options& options, unsigned number) {
    const ChangeDirectory change = numbered(number);
    try {
        if (options.confirmSeconds) {
            undo::lengthenChange(change,
                                 static_cast<std::uint64_t>(std::ceil(*options.confirmSeconds * kThousand)));
        } else {
            undo::confirmChange(change);
        }
    } catch (const ChangeError& error) {
        throw Failure(ExitStatus::failed, printable(error.what()));
    }
}

remote::RolledBack rolledBackHere(unsigned number) {
    const auto last = number == 0 ? undo::lastStanding(kChangesPlace) : std::optional(number);
    if (!last) {
        throw Failure(ExitStatus::notFound, "there is no change that could be taken back");
    }
    const ChangeDirectory change = numbered(*last);
    StopSignals::ignore();  // broken off in its middle it would leave a host that nobody reaches
    try {
        const Journal journal = undo::rollBack(kChangesPlace, change);
        return {*last, undo::stageText(journal.stage), journal.notes};
    } catch (const ChangeError& error) {
        throw Failure(ExitStatus::failed, printable(error.what()));
    }
}

}  // namespace

ExitStatus confirmChange(const Options& options) {
    const unsigned number = numberIn(options.change);
    if (!isRoot() && !remote::confirmChange(options, number)) {
        mustBeRoot("confirm " + options.change);
    }
    if (isRoot()) {
        confirmHere(options, number);
    }
    const std::string done =
        options.confirmSeconds
            ? " has " + std::to_string(std::lround(*options.confirmSeconds)) + " seconds from now on\n"
            : " is kept\n";
    print("change " + std::to_string(number) + done);
    return ExitStatus::done;
}

ExitStatus rollback(const Options& options) {
    const unsigned number = options.change.empty() ? 0 : numberIn(options.change);
    const auto back = isRoot() ? rolledBackHere(number) : remote::rollBack(options, number);
    if (!back) {
        mustBeRoot(options.change.empty() ? "rollback" : "rollback " + options.change);
    }
    print("change " + std::to_string(back->number) + " " + printable(back->stage) + "\n");
    if (!back->notes.empty()) {
        complain("not all of it:" + change::notesOf(back->notes));
    }
    const bool isDone = back->stage == undo::stageText(undo::Stage::takenBack) && back->notes.empty();
    return isDone ? ExitStatus::done : ExitStatus::failed;
}

ExitStatus listChanges(const Options& options) {
    if (!isRoot()) {
        throw Failure(
            ExitStatus::failed,
            "only root sees the changes that can be taken back: what they have saved is not for "
            "everybody\nRun: sudo cvagent history --changes, or without --changes for what was written");
    }
    std::string text;
    ExitStatus status = ExitStatus::done;
    const std::vector<unsigned> numbers = undo::changesIn(kChangesPlace);
    for (const unsigned number : numbers) {
        try {
            const ChangeDirectory change(kChangesPlace, number);
            if (const auto journal = change.journal()) {
                text +=
                    options.json
                        ? objectOf(change, *journal).dump(-1, ' ', false, Json::error_handler_t::replace) +
                              "\n"
                        : linesOf(change, *journal);
            }
        } catch (const ChangeError& error) {
            complain("change " + std::to_string(number) + ": " + printable(error.what()));
            status = ExitStatus::failed;
        }
    }
    print(text);
    if (numbers.empty()) {
        complain("no change has been made so far that could be taken back");
    }
    return status;
}

}  // namespace cvagent::commands
