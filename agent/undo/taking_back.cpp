#include "agent/undo/taking_back.h"

#include <chrono>
#include <thread>
#include <utility>

#include "agent/undo/boot_clock.h"

namespace cvagent::undo {

namespace {

using hosttools::Descriptor;

constexpr std::chrono::milliseconds kLook{100};
constexpr std::chrono::milliseconds kNextTry{1000};  // to write on a full disk
/// Commands that hang are ended before; a daemon that a step has started is not waited for.
constexpr std::uint64_t kLongestStep = 60'000;

/// What was so when the taking back of a whole change began; kept, so that who goes on with it takes nothing
/// for somebody else's work that was half put back. On a full disk the host comes first.
SavedState beganOf(const ChangeDirectory& change, const SavedState& before) {
    auto kept = change.load("began");
    if (kept) {
        return *std::move(kept);
    }
    SavedState began = before.again();
    try {
        change.save("began", began);
    } catch (const ChangeError&) {
        return began;
    }
    return began;
}

/// @param calls of those that were saved, the ones to be run
TakenBack takeSavedBack(const ChangeDirectory& change, KeeperCalls (*calls)(const KeeperCalls&)) {
    auto before = change.load("before");
    if (!before) {
        throw ChangeError("nothing was saved");
    }
    before->calls = calls(before->calls);
    const auto left = change.load("left");
    try {
        return left ? takeBack(*before, &*left, beganOf(change, *before))
                    : takeBack(*before, nullptr, before->again());
    } catch (const BadRecord& bad) {
        throw ChangeError(bad.what());
    }
}

/// For now, and so without asking others; what cannot be read is told in the end.
void takeSavedBackAtOnce(const ChangeDirectory& change) {
    try {
        takeSavedBack(change, [](const KeeperCalls&) { return KeeperCalls(); });
    } catch (const ChangeError&) {
        return;
    }
}

/// Marks it as to be taken back, unless it has come to its end meanwhile.
Journal beginToTakeBack(const ChangeDirectory& change) {
    return change.update([](Journal& journal) {
        const bool goesOn = !journal.isEnded() && journal.stage != Stage::takingBack;
        journal.stage = goesOn ? Stage::takingBack : journal.stage;
        return goesOn;
    });
}

Journal endWith(const ChangeDirectory& change, Stage stage, std::vector<std::string> notes) {
    return change.update([&](Journal& journal) {
        journal.stage = stage;
        journal.notes = std::move(notes);
        return true;
    });
}

/// Who makes the change may be at a step still, which writes after all was put back. So that the host is back
/// in time it is put back at once, and when he has ended once more.
void takeBackFromMaker(const ChangeDirectory& change) {
    const std::uint64_t settling = change.journal().value_or(Journal{}).settling;
    if ((change.isTaken(kStepLock) || settling != 0) && !change.load("left")) {
        {
            const Descriptor alone = change.waitFor(kTakingLock);
            if (beginToTakeBack(change).stage != Stage::takingBack) {
                return;
            }
            takeSavedBackAtOnce(change);
        }
        const std::uint64_t begin = bootMilliseconds();
        const auto isOver = [begin](std::uint64_t time) { return bootMilliseconds() - begin >= time; };
        while (!isOver(settling) || (change.isTaken(kStepLock) && !isOver(kLongestStep))) {
            std::this_thread::sleep_for(kLook);
        }
    }
    takeChangeBack(change);
}

/// What was not begun has ended; what is over is to be taken back.
/// @param isMaker whether who makes it is alive, looked up before the journal: without him it is his last
/// word
Stage stageByNow(const Journal& journal, bool isMaker) {
    const bool isMade = journal.stage == Stage::changing || journal.stage == Stage::made;
    if (journal.stage == Stage::saved && !isMaker) {
        return Stage::takenBack;
    }
    const bool isLeft = journal.stage == Stage::changing && !isMaker;
    return isLeft || (isMade && journal.isDue()) ? Stage::takingBack : journal.stage;
}

/// One look of the guard. It judges with the journal locked: whoever confirms the change or gives it more
/// time is before that or too late. @return whether it has ended
bool lookOnce(const ChangeDirectory& change) {
    const bool isMaker = change.isTaken(kAgentLock);
    const Journal now = change.update([isMaker](Journal& journal) {
        const Stage was = std::exchange(journal.stage, stageByNow(journal, isMaker));
        return journal.stage != was;
    });
    if (now.stage == Stage::takingBack && !change.isTaken(kTakingLock)) {
        takeBackFromMaker(change);
    }
    return now.isEnded();
}

/// Where nothing can be written down, as on a full disk, the host comes back in time all the same; the
/// journal follows when there is room again. Throws ChangeError when the change cannot be read either.
void putBackUnwritten(const ChangeDirectory& change, bool& isBack) {
    const bool isMaker = change.isTaken(kAgentLock);
    const Journal journal = change.journal().value_or(Journal{});
    if (!isBack && stageByNow(journal, isMaker) == Stage::takingBack) {
        const Descriptor alone = change.waitFor(kTakingLock);
        takeSavedBackAtOnce(change);
        isBack = true;
    }
}

/// @param isBack whether the host is, and only the journal does not say so
bool hasEnded(const ChangeDirectory& change, bool& isBack) {
    try {
        return lookOnce(change);
    } catch (const ChangeError&) {
        if (change.isGone()) {
            return true;
        }
        putBackUnwritten(change, isBack);
        std::this_thread::sleep_for(kNextTry);
        return false;
    }
}

std::string sentence(unsigned number, const Journal& journal) {
    std::string text = "change " + std::to_string(number) + ": " + stageText(journal.stage);
    for (const std::string& note : journal.notes) {
        text += "; " + note;
    }
    return text;
}

Journal takeBackWith(const ChangeDirectory& change, KeeperCalls (*calls)(const KeeperCalls&)) {
    const Descriptor alone = change.waitFor(kTakingLock);
    Journal journal = beginToTakeBack(change);
    if (journal.stage != Stage::takingBack) {
        return journal;
    }
    try {
        return endWith(change, Stage::takenBack, takeSavedBack(change, calls).notes);
    } catch (const ChangeError& error) {
        return endWith(change, Stage::failed, {error.what()});
    }
}

}  // namespace

Journal takeChangeBack(const ChangeDirectory& change) {
    return takeBackWith(change, [](const KeeperCalls& all) { return all; });
}

std::vector<std::string> takeBackAfterStart(const std::string& place, bool& isWhole) {
    std::vector<std::string> told;
    for (const unsigned number : changesIn(place)) {
        try {
            const ChangeDirectory change(place, number);
            const auto journal = change.journal();
            if (journal && journal->isOpen() && journal->boot != bootId()) {
                const auto starting = [](const KeeperCalls& all) { return all.whileStarting(); };
                const Journal now = takeBackWith(change, starting);
                isWhole = isWhole && now.stage == Stage::takenBack && now.notes.empty();
                told.push_back(sentence(number, now));
            }
        } catch (const ChangeError& error) {
            isWhole = false;
            told.push_back("change " + std::to_string(number) + ": " + error.what());
        }
    }
    return told;
}

std::vector<std::string> guardChange(const ChangeDirectory& change) {
    const Descriptor alone = change.take(kGuardLock);
    if (!alone.isOpen()) {
        return {};
    }
    for (bool isBack = false; !hasEnded(change, isBack);) {
        std::this_thread::sleep_for(kLook);
    }
    if (change.isGone()) {
        return {"change " + std::to_string(change.number()) +
                ": somebody has removed what was saved; it stays as it is"};
    }
    const Journal journal = change.journal().value_or(Journal{});
    return journal.stage == Stage::kept ? std::vector<std::string>()
                                        : std::vector{sentence(change.number(), journal)};
}

}  // namespace cvagent::undo
