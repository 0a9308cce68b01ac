#include "agent/undo/making.h"

#include <fcntl.h>

#include <algorithm>
#include <ctime>
#include <set>

#include "agent/undo/boot_clock.h"
#include "agent/undo/taking_back.h"

namespace cvagent::undo {

namespace {

std::string named(unsigned number) {
    return "change " + std::to_string(number);
}

std::optional<Journal> readableJournal(const std::string& place, unsigned number) {
    try {
        return ChangeDirectory(place, number).journal();
    } catch (const ChangeError&) {
        return std::nullopt;
    }
}

bool isBeingMade(const std::string& place, unsigned number) {
    try {
        return ChangeDirectory(place, number).isTaken(kAgentLock);
    } catch (const ChangeError&) {
        return false;
    }
}

/// What to do when a change is in the way.
std::string wayOut(unsigned number, Stage stage) {
    const std::string rollback = "cvagent rollback " + std::to_string(number);
    return stage == Stage::made ? "; first: cvagent confirm " + std::to_string(number) + ", or " + rollback
           : stage == Stage::takingBack ? "; when nobody is at it: " + rollback
                                        : "";
}

/// Two that could be taken back at once would meet.
void refuseBesideOthers(const std::string& place) {
    for (const unsigned number : changesIn(place)) {
        const auto journal = readableJournal(place, number);
        if (journal && journal->isOpen()) {
            throw ChangeError(named(number) + " " + stageText(journal->stage) +
                              wayOut(number, journal->stage));
        }
        if (isBeingMade(place, number)) {
            throw ChangeError(named(number) + " " + stageText(Stage::changing));
        }
    }
}

SavedState savedBefore(const MakingSettings& settings) {
    std::set<std::string> each;
    for (const std::string& path : settings.paths) {
        each.insert(withoutLinks(path));
    }
    SavedState before = SavedState::of({each.begin(), each.end()}, settings.hasNetwork);
    before.calls = settings.calls;
    std::ranges::transform(before.calls.files, before.calls.files.begin(), withoutLinks);
    if (const std::string obstacle = before.obstacle(); !obstacle.empty()) {
        throw ChangeError("it could not be taken back: " + obstacle);
    }
    return before;
}

bool stands(const Journal& journal) {
    return journal.stage != Stage::saved && journal.stage != Stage::takenBack &&
           journal.stage != Stage::failed;
}

/// Nobody begins another change meanwhile, nor before this one is back.
void markForRollBack(const std::string& place, const ChangeDirectory& change) {
    const hosttools::Descriptor alone = ChangeDirectory::lockPlace(place);
    for (const unsigned number : changesIn(place)) {
        const auto journal = readableJournal(place, number);
        if (number > change.number() && journal && stands(*journal)) {
            throw ChangeError(named(number) + " stands on it");
        }
        if (number > change.number() && isBeingMade(place, number)) {
            throw ChangeError(named(number) + " is about to begin");
        }
    }
    const auto journal = change.journal();
    if (!journal || !stands(*journal)) {
        throw ChangeError(named(change.number()) + " does not stand: it " +
                          stageText(journal ? journal->stage : Stage::saved));
    }
    if (journal->stage == Stage::changing && change.isTaken(kAgentLock)) {
        throw ChangeError(named(change.number()) + " is under way");
    }
    change.update([](Journal& now) {
        const bool goesOn = stands(now) && now.stage != Stage::takingBack;
        now.stage = goesOn ? Stage::takingBack : now.stage;
        return goesOn;
    });
}

}  // namespace

ChangeInMaking::ChangeInMaking(const MakingSettings& settings)
    : place_(ChangeDirectory::lockPlace(settings.place)),
      directory_([&settings] {
          refuseBesideOthers(settings.place);
          return ChangeDirectory::make(settings.place);
      }()),
      window_(std::min(settings.window, kLongestWindow)) {
    try {
        alive_ = directory_.take(kAgentLock);
        inSteps_ = directory_.take(kStepLock);
        save(settings);
    } catch (const ChangeError&) {
        forget();  // half of it would take away room, and the place of an older one
        throw;
    }
}

void ChangeInMaking::save(const MakingSettings& settings) {
    before_ = savedBefore(settings);
    place_ = {};
    directory_.save("before", before_);
    directory_.isTaken(kTakingLock);  // makes its file, for which there may be no room later
    begun_.boot = before_.boot;
    begun_.window = window_;
    begun_.deadline = bootMilliseconds() + window_;
    begun_.settling = settings.settling;
    begun_.steps = settings.steps;
    begun_.began = static_cast<std::uint64_t>(std::time(nullptr));
    begun_.caller = settings.caller;
    begun_.summary = settings.summary;
    if (window_ != 0) {
        update([](Journal&) { return true; });  // for the guard
    }
}

/// Who waits for nobody has the journal begin with the first step, for each write of it is one to the disk.
Journal ChangeInMaking::update(const std::function<bool(Journal&)>& change) {
    return directory_.update([&](Journal& journal) {
        journal = journal.began == 0 ? begun_ : journal;
        return change(journal);
    });
}

void ChangeInMaking::beginStep() {
    fcntl(inSteps_.get(), F_SETFD, 0);  // what a step starts inherits it; the guard was started before
    const Journal now = update([this](Journal& journal) {
        const bool isFirst = journal.stage == Stage::saved;
        if (!isFirst && journal.stage != Stage::changing) {
            return false;
        }
        journal.stage = Stage::changing;
        journal.deadline = isFirst ? bootMilliseconds() + window_ : journal.deadline;
        ++journal.step;
        return true;
    });
    if (now.stage != Stage::changing) {
        throw ChangeError(named(number()) + ": its time is over, and it " + stageText(now.stage));
    }
}

/// What is there while somebody takes it back is not what the change has left.
Journal ChangeInMaking::end() {
    bool isNothing = false;
    Journal ended = update([&](Journal& journal) {
        if (journal.stage != Stage::saved && journal.stage != Stage::changing) {
            return false;
        }
        const SavedState left = before_.again();
        isNothing = window_ == 0 && left.isAs(before_);
        journal.stage = window_ == 0 ? Stage::kept : Stage::made;
        journal.deadline = std::max(journal.deadline, bootMilliseconds() + window_);  // it may be lengthened
        if (!isNothing) {
            directory_.save("left", left);
        }
        return !isNothing;
    });
    if (isNothing) {
        forget();
    }
    return ended;
}

Journal ChangeInMaking::takeBack() {
    return takeChangeBack(directory_);
}

void ChangeInMaking::forget() {
    directory_.remove();
}

void confirmChange(const ChangeDirectory& change) {
    bool isConfirmed = false;
    const Journal now = change.update([&isConfirmed](Journal& journal) {
        isConfirmed = journal.stage == Stage::made && !journal.isDue();
        journal.stage = isConfirmed ? Stage::kept : journal.stage;
        return isConfirmed;
    });
    if (!isConfirmed) {
        const bool isLate = now.stage == Stage::made;
        throw ChangeError(named(change.number()) +
                          " cannot be confirmed: " + (isLate ? "its time is over, and it " : "it ") +
                          stageText(isLate ? Stage::takingBack : now.stage));
    }
}

void lengthenChange(const ChangeDirectory& change, std::uint64_t milliseconds) {
    bool isLonger = false;
    change.update([&](Journal& journal) {
        isLonger = journal.window != 0 && !journal.isDue() &&
                   (journal.stage == Stage::made || journal.stage == Stage::changing);
        journal.deadline = isLonger ? bootMilliseconds() + milliseconds : journal.deadline;
        return isLonger;
    });
    if (!isLonger) {
        throw ChangeError(named(change.number()) + " waits for no confirmation");
    }
}

Journal rollBack(const std::string& place, const ChangeDirectory& change) {
    markForRollBack(place, change);
    return takeChangeBack(change);
}

std::optional<unsigned> lastStanding(const std::string& place) {
    std::vector<unsigned> numbers = changesIn(place);
    const auto last = std::find_if(numbers.rbegin(), numbers.rend(), [&place](unsigned number) {
        const auto journal = readableJournal(place, number);
        return journal && stands(*journal);
    });
    return last == numbers.rend() ? std::nullopt : std::optional(*last);
}

}  // namespace cvagent::undo
