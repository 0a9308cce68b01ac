#include "agent/change/revocable.h"

#include <unistd.h>

#include <algorithm>
#include <cmath>

#include "agent/change/guarding.h"
#include "agent/change/kept.h"
#include "agent/core/text.h"

namespace cvagent::change {

namespace {

constexpr double kThousand = 1000;

std::string summaryOf(const std::vector<MeantChange>& changes) {
    const std::string more =
        changes.size() == 1 ? "" : " and " + std::to_string(changes.size() - 1) + " more";
    return changes.front().target() + more;
}

std::string secondsText(double seconds) {
    const long whole = std::lround(seconds);
    return std::to_string(whole) + (whole == 1 ? " second" : " seconds");
}

bool isOfNetwork(const std::vector<MeantChange>& changes) {
    return std::ranges::any_of(changes,
                               [](const MeantChange& each) { return each.row->type != NodeType::computer; });
}

bool isAnyTakenBack(const std::vector<MeantChange>& changes) {
    return std::ranges::any_of(changes, [](const MeantChange& each) { return !isDeed(*each.row); });
}

}  // namespace

void Revocable::begin(const std::vector<MeantChange>& changes, const std::vector<FileChange>& planned) {
    if (geteuid() != 0 || (!seconds_ && !isAnyTakenBack(changes))) {
        seconds_.reset();
        return;
    }
    try {
        open(changes, planned);
    } catch (const undo::ChangeError& error) {
        const std::string reason = printable(error.what());
        if (seconds_ && !settings_.madeUnguarded) {
            throw Problem(Problem::failed, "the change cannot be guarded: " + reason + "\nNothing was done");
        }
        giveUp(reason);
    }
}

/// It is made all the same.
void Revocable::giveUp(const std::string& reason) {
    if (making_ && !seconds_) {
        making_->forget();  // half of it would take away room, and the place of an older one
    }
    making_.reset();
    seconds_.reset();
    settings_.tell("the change cannot be taken back later: " + reason);
}

void Revocable::open(const std::vector<MeantChange>& changes, const std::vector<FileChange>& planned) {
    undo::MakingSettings making;
    making.place = changesPlace();
    making.caller = settings_.caller;
    making.summary = summaryOf(changes);
    making.hasNetwork = isOfNetwork(changes);
    making.paths = touchedPaths(planned, making.hasNetwork);
    making.calls = keeperCallsFor(changes);
    making.paths.insert(making.paths.end(), making.calls.files.begin(), making.calls.files.end());
    making.steps = changes.size();
    making.window = seconds_ ? static_cast<std::uint64_t>(std::ceil(*seconds_ * kThousand)) : 0;
    making.settling = settings_.settling;
    making_.emplace(making);
    if (seconds_) {
        startGuard(making_->directory());
    }
}

void Revocable::beginStep() {
    if (!making_) {
        return;
    }
    try {
        making_->beginStep();
    } catch (const undo::ChangeError& error) {
        const std::string reason = printable(error.what());
        if (seconds_) {
            throw Problem(Problem::failed, reason);
        }
        giveUp(reason);
    }
}

bool Revocable::end(bool hasFailed) {
    if (!making_) {
        return false;
    }
    try {
        if (hasFailed && (seconds_ || !settings_.keepsHalf)) {
            return isTakenBack();
        }
        tellMade();
    } catch (const undo::ChangeError& error) {
        tellUnwritten(hasFailed, printable(error.what()));
    }
    return false;
}

/// The guard takes for left what has no end in its journal.
void Revocable::tellUnwritten(bool hasFailed, const std::string& reason) {
    if (!seconds_) {
        making_->forget();
        settings_.tell("the change cannot be taken back later: " + reason);
        return;
    }
    const std::string text =
        "change " + std::to_string(making_->number()) + " is taken back by its guard: " + reason;
    if (!hasFailed) {
        throw Problem(Problem::failed, text);
    }
    settings_.tell(text);
}

void Revocable::tellMade() {
    const undo::Journal journal = making_->end();
    const std::string number = std::to_string(making_->number());
    if (journal.stage == undo::Stage::made) {
        settings_.tell("change " + number + " is taken back in " + secondsText(*seconds_) +
                       " unless somebody types: cvagent confirm " + number);
    } else if (journal.stage != undo::Stage::kept) {
        throw Problem(Problem::failed, "change " + number + " " + undo::stageText(journal.stage) +
                                           ": its time was over before all was written");
    }
}

bool Revocable::isTakenBack() {
    if (settings_.beforeTakingBack) {
        settings_.beforeTakingBack();
    }
    const undo::Journal journal = making_->takeBack();
    settings_.tell("change " + std::to_string(making_->number()) + " " + undo::stageText(journal.stage) +
                   notesOf(journal.notes));
    return journal.stage == undo::Stage::takenBack;
}

WriteResult writeRevocably(ChangedHost& host, const MeantChange& change, const Request& request,
                           RevocableSettings settings) {
    settings.keepsHalf = true;
    Revocable revocable(std::move(settings));
    revocable.begin({change}, {});
    revocable.beginStep();
    WriteResult result = host.write(change.node, *change.row, change.words, request);
    // What is made only after its time is the change's work as well: it has no end then.
    if (!result.problem || result.problem->kind() != Problem::timedOut) {
        revocable.end(result.problem.has_value());
    }
    return result;
}

std::string notesOf(const std::vector<std::string>& notes) {
    std::string text;
    for (const std::string& note : notes) {
        text += "\n" + printable(note);
    }
    return text;
}

}  // namespace cvagent::change
