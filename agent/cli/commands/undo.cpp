// What becomes of changes that were made: confirm, rollback, history --changes.
#include <unistd.h>

#include <cmath>
#include <ctime>
#include <nlohmann/json.hpp>

#include "agent/cli/commands/commands.h"
#include "agent/cli/print.h"
#include "agent/cli/safeguard.h"
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

void mustBeRoot() {
    if (geteuid() != 0) {
        throw Failure(ExitStatus::failed,
                      "only root keeps and takes back changes of the host\nRun it with: sudo");
    }
}

ChangeDirectory named(const std::string& word) {
    const auto number = undo::changeNumber(word);
    if (!number) {
        throw Failure(ExitStatus::usage, inQuotes(word) + " is no number of a change");
    }
    try {
        return {kChangesPlace, *number};
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

/// @return a line, and one for each thing that is not back
std::string linesOf(unsigned number, const Journal& journal) {
    std::string text = padded(std::to_string(number), 6) + timeText(journal.began) + "  " +
                       padded(undo::stageText(journal.stage), 28) + printable(journal.summary) + "  (by " +
                       printable(journal.caller) + ")\n";
    for (const std::string& note : journal.notes) {
        text += "      " + printable(note) + "\n";
    }
    return text;
}

Json objectOf(unsigned number, const Journal& journal) {
    return {{"change", number},
            {"time", timeText(journal.began)},
            {"stage", undo::stageText(journal.stage)},
            {"summary", journal.summary},
            {"by", journal.caller},
            {"notes", journal.notes}};
}

}  // namespace

ExitStatus confirmChange(const Options& options) {
    mustBeRoot();
    const ChangeDirectory change = named(options.change);
    const std::string number = "change " + std::to_string(change.number());
    try {
        if (options.confirmSeconds) {
            undo::lengthenChange(change,
                                 static_cast<std::uint64_t>(std::ceil(*options.confirmSeconds * kThousand)));
            print(number + " has " + std::to_string(std::lround(*options.confirmSeconds)) +
                  " seconds from now on\n");
        } else {
            undo::confirmChange(change);
            print(number + " is kept\n");
        }
    } catch (const ChangeError& error) {
        throw Failure(ExitStatus::failed, printable(error.what()));
    }
    return ExitStatus::done;
}

ExitStatus rollback(const Options& options) {
    mustBeRoot();
    std::string word = options.change;
    if (word.empty()) {
        const auto last = undo::lastStanding(kChangesPlace);
        if (!last) {
            throw Failure(ExitStatus::notFound, "there is no change that could be taken back");
        }
        word = std::to_string(*last);
    }
    const ChangeDirectory change = named(word);
    StopSignals::ignore();  // broken off in its middle it would leave a host that nobody reaches
    try {
        const Journal journal = undo::rollBack(kChangesPlace, change);
        print("change " + std::to_string(change.number()) + " " + undo::stageText(journal.stage) + "\n");
        if (!journal.notes.empty()) {
            complain("not all of it:" + notesOf(journal));
        }
        const bool isDone = journal.stage == undo::Stage::takenBack && journal.notes.empty();
        return isDone ? ExitStatus::done : ExitStatus::failed;
    } catch (const ChangeError& error) {
        throw Failure(ExitStatus::failed, printable(error.what()));
    }
}

ExitStatus listChanges(const Options& options) {
    mustBeRoot();
    std::string text;
    ExitStatus status = ExitStatus::done;
    const std::vector<unsigned> numbers = undo::changesIn(kChangesPlace);
    for (const unsigned number : numbers) {
        try {
            if (const auto journal = ChangeDirectory(kChangesPlace, number).journal()) {
                text +=
                    options.json
                        ? objectOf(number, *journal).dump(-1, ' ', false, Json::error_handler_t::replace) +
                              "\n"
                        : linesOf(number, *journal);
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
