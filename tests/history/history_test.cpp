// What a history keeps, and in which order, whoever writes, dies or turns the clock.
#include <gmock/gmock.h>
#include <signal.h>
#include <sys/wait.h>
#include <unistd.h>

#include <filesystem>
#include <numeric>

#include "tests/history/kept.h"
#include "tests/support/fake_host.h"

namespace {

using cvagent::Event;
using cvagent::History;
using cvagent::HistoryEntry;
using cvagent::HistoryLimits;
using cvagent::HistoryQuery;
using kept::kPlace;
using testing::ElementsAre;
using testing::IsEmpty;

constexpr std::size_t kAll = 1000000;

HOST_TEST(History, KeepsEverythingOfAnEvent) {
    Event event = kept::event("Computer", Event::Kind::written, 1795000000);
    event.nodeId = 4294967295U;
    event.nodeClass = "computer";
    event.property = 115;
    event.propertyName = "OwnerContact";
    event.before = std::string("zero\0 inside", 12);
    event.after = "broken \xff\xfe text";
    event.caller = "anna (uid 1000) as root (uid 0)";
    event.wanted = "room 5";
    event.verdict = "differs: why";
    event.plan = "{}";
    event.firstCode = 1;
    event.secondCode = 2;
    event.eventCode = 3;
    EXPECT_EQ(kept::append(*std::make_unique<History>(kPlace), event), 1U);
    const HistoryEntry found = History(kPlace).read({}, kAll).at(0);
    EXPECT_EQ(found.event.number, 1U);
    EXPECT_EQ(found.event.kind, Event::Kind::written);
    EXPECT_EQ(found.event.time, 1795000000);
    EXPECT_EQ(found.event.nodeId, 4294967295U);
    EXPECT_EQ(found.event.property, 115U);
    EXPECT_EQ(found.event.firstCode, 1U);
    EXPECT_EQ(found.event.secondCode, 2U);
    EXPECT_EQ(found.event.eventCode, 3U);
    for (const auto text :
         {&Event::path, &Event::message, &Event::nodeClass, &Event::propertyName, &Event::before,
          &Event::after, &Event::caller, &Event::wanted, &Event::verdict, &Event::plan}) {
        EXPECT_EQ(found.event.*text, event.*text);
    }
    EXPECT_EQ(found.boot.size(), found.boot.empty() ? 0U : 36U);
}

HOST_TEST(History, KeepsEachKind) {
    History history(kPlace);
    const std::vector kinds = {Event::Kind::published, Event::Kind::withdrawn, Event::Kind::alert,
                               Event::Kind::written, Event::Kind::changed};
    for (const Event::Kind kind : kinds) {
        kept::append(history, kept::event("x", kind));
    }
    std::vector<Event::Kind> found;
    for (const HistoryEntry& entry : history.read({}, kAll)) {
        found.push_back(entry.event.kind);
    }
    EXPECT_EQ(found, kinds);
}

HOST_TEST(History, CutsATextThatIsTooLongBetweenCharacters) {
    History history(kPlace);
    std::string text(65535, 'x');
    text += "\u00fc and more";
    kept::append(history, kept::event(text));
    EXPECT_EQ(history.read({}, 1).front().event.message,
              std::string(65535, 'x') + "... (" + std::to_string(text.size()) + " bytes)");
}

HOST_TEST(History, NumbersGoOnAndAreNotGivenAgain) {
    {
        History history(kPlace);
        EXPECT_EQ(history.last(), 0U);
        EXPECT_EQ(kept::append(history, kept::event("a")), 1U);
        EXPECT_EQ(kept::append(history, kept::event("b")), 2U);
        history.setLimits({std::chrono::hours(1), 0});
        EXPECT_THAT(history.read({}, kAll), IsEmpty());
        EXPECT_EQ(history.last(), 2U);
    }
    History history(kPlace);
    EXPECT_EQ(kept::append(history, kept::event("c")), 3U);
    std::vector<Event> events = {kept::event("d"), kept::event("e")};
    history.append(events, 10);  // others up to 10 were told although they could not be kept
    EXPECT_EQ(events[0].number, 11U);
    EXPECT_EQ(events[1].number, 12U);
}

HOST_TEST(History, AnEventKeepsANumberThatWasToldUnlessItIsTaken) {
    History history(kPlace);
    std::vector<Event> events = {kept::event("a"), kept::event("b")};
    events[0].number = 5;
    history.append(events, 5);
    EXPECT_EQ(events[0].number, 5U);
    EXPECT_EQ(events[1].number, 6U);
    std::vector<Event> again = {kept::event("c")};
    again[0].number = 6;
    history.append(again, 6);
    EXPECT_EQ(again[0].number, 7U);
}

HOST_TEST(History, IsAskedByNumberTimeNodeAndKind) {
    History history(kPlace);
    std::vector<Event> events = {kept::event("1", Event::Kind::written, 100),
                                 kept::event("2", Event::Kind::published, 50),  // the clock was set back
                                 kept::event("3", Event::Kind::alert, 200), kept::event("4")};
    events[1].path = "/oshw/root/hard-drive:sda";
    events[2].path = "/oshw/root/hard-drive:xsda";
    history.append(events);
    const auto found = [&history](HistoryQuery query) { return kept::messages(history.read(query, kAll)); };
    EXPECT_THAT(found({}), ElementsAre("1", "2", "3", "4"));
    EXPECT_THAT(found({.after = 1, .upTo = 3}), ElementsAre("2", "3"));
    EXPECT_THAT(found({.since = 100, .until = 200}), ElementsAre("1", "3"));
    EXPECT_THAT(found({.kinds = {Event::Kind::alert, Event::Kind::published}}), ElementsAre("2", "3"));
    for (const char* node : {"/oshw/root/hard-drive:sda", "hard-drive:sda", "sda"}) {
        EXPECT_THAT(found({.node = node}), ElementsAre("2")) << node;
    }
    for (const char* node : {"da", "drive:sda", "root", "%", "/oshw"}) {
        EXPECT_THAT(found({.node = node}), IsEmpty()) << node;
    }
    EXPECT_THAT(kept::messages(history.read({}, 2)), ElementsAre("1", "2"));
}

HOST_TEST(History, TellsEachUserWhatHeWasNotShown) {
    History history(kPlace);
    for (const char* message : {"1", "2", "3"}) {
        kept::append(history, kept::event(message));
    }
    const History::Unseen first = history.unseen(1000, 2);
    EXPECT_THAT(kept::messages(first.entries), ElementsAre("2", "3"));
    EXPECT_EQ(first.left, 1U);
    history.shown(1000, 2);
    history.shown(1000, 1);  // never less than was shown
    const History::Unseen then = history.unseen(1000, 2);
    EXPECT_THAT(kept::messages(then.entries), ElementsAre("3"));
    EXPECT_EQ(then.left, 0U);
    EXPECT_EQ(history.unseen(0, 10).entries.size(), 3U);
    history.shown(1000, 99);  // nobody was shown what is still to come
    EXPECT_THAT(history.unseen(1000, 10).entries, IsEmpty());
    kept::append(history, kept::event("4"));
    EXPECT_THAT(kept::messages(History(kPlace).unseen(1000, 10).entries), ElementsAre("4"));
}

/// A process that keeps alerts and is ended before its plug-in has taken them for told.
HOST_TEST(History, AnAlertThatIsToldOnceMoreIsTheSameEntry) {
    {
        History ended(kPlace);
        EXPECT_EQ(kept::append(ended, kept::alert("NIC is Offline ")), 1U);
        EXPECT_EQ(kept::append(ended, kept::alert("NIC is Offline ", "/network-port:eth1")), 2U);
    }
    History history(kPlace);
    EXPECT_EQ(kept::append(history, kept::alert("NIC is Offline ")), 1U);
    EXPECT_EQ(kept::append(history, kept::alert("NIC is Online ", "/network-port:eth1")), 3U);
    EXPECT_EQ(kept::append(history, kept::alert("NIC is Offline ")), 4U)
        << "this process has told it already";
    EXPECT_EQ(history.read({}, kAll).size(), 4U);
}

HOST_TEST(History, AnAlertThatWasTakenForToldIsNotTheSame) {
    {
        History history(kPlace);
        kept::append(history, kept::alert("NIC has Switched Over "));
        history.settle();
    }
    History history(kPlace);
    EXPECT_EQ(kept::append(history, kept::alert("NIC has Switched Over ")), 2U);
}

/// Writes without end, and says each number that was acknowledged.
[[noreturn]] void writeAndSay(int pipe) {
    History history(kPlace);
    for (;;) {
        const std::uint64_t number = kept::append(history, kept::event("by " + std::to_string(getpid())));
        if (write(pipe, &number, sizeof number) != sizeof number) {
            _exit(0);
        }
    }
}

struct Writer {
    Writer() {
        if (pipe(ends) != 0) {
            throw std::runtime_error("no pipe");
        }
        process = fork();
        if (process == 0) {
            close(ends[0]);
            writeAndSay(ends[1]);
        }
        close(ends[1]);
    }
    std::vector<std::uint64_t> acknowledged(std::size_t most) {
        std::vector<std::uint64_t> all;
        std::uint64_t number = 0;
        while (all.size() < most && read(ends[0], &number, sizeof number) == sizeof number) {
            all.push_back(number);
        }
        return all;
    }
    void end() {
        kill(process, SIGKILL);
        waitpid(process, nullptr, 0);
    }
    ~Writer() { close(ends[0]); }

    int ends[2];
    pid_t process;
};

/// Whatever the moment: the kill comes while the writer is anywhere behind what was read so far.
HOST_TEST(History, LosesNothingThatWasAcknowledgedToAKill) {
    const char* wanted = std::getenv("CORVISTA_TEST_ROUNDS");
    const std::size_t rounds = wanted != nullptr ? std::stoul(wanted) : 30;
    std::vector<std::uint64_t> acknowledged;
    for (std::size_t round = 0; round < rounds; ++round) {
        Writer one;
        Writer other;
        for (Writer* writer : {&one, &other}) {
            const auto some = writer->acknowledged(round % 7 + 1);
            acknowledged.insert(acknowledged.end(), some.begin(), some.end());
        }
        one.end();
        other.end();
        for (Writer* writer : {&one, &other}) {
            const auto rest = writer->acknowledged(kAll);
            acknowledged.insert(acknowledged.end(), rest.begin(), rest.end());
        }
    }
    std::ranges::sort(acknowledged);
    EXPECT_EQ(std::ranges::adjacent_find(acknowledged), acknowledged.end());
    const auto numbers = kept::numbers(History(kPlace).read({}, kAll));
    EXPECT_TRUE(std::ranges::includes(numbers, acknowledged));
    EXPECT_LE(numbers.size(), acknowledged.size() + 2 * rounds);
}

HOST_TEST(History, IsWrittenByTwoProcessesAtOnce) {
    Writer one;
    Writer other;
    const auto ones = one.acknowledged(200);
    const auto others = other.acknowledged(200);
    one.end();
    other.end();
    EXPECT_EQ(ones.size(), 200U);
    EXPECT_EQ(others.size(), 200U);
    EXPECT_TRUE(std::ranges::is_sorted(ones));
    const auto numbers = kept::numbers(History(kPlace).read({}, kAll));
    std::vector<std::uint64_t> expected(numbers.size());
    std::iota(expected.begin(), expected.end(), 1);
    EXPECT_EQ(numbers, expected);
}

std::uintmax_t sizeOnDisk() {
    return std::filesystem::file_size(kPlace.file());
}

std::vector<Event> many(std::size_t count, std::time_t time) {
    std::vector<Event> events;
    for (std::size_t i = 0; i < count; ++i) {
        events.push_back(kept::event(std::string(100, 'x'), Event::Kind::changed, time));
    }
    return events;
}

HOST_TEST(History, StaysAsLargeAsItMay) {
    History history(kPlace);
    history.setLimits({std::chrono::hours(24), std::uint64_t{1} << 20});
    std::uintmax_t largest = 0;
    for (int i = 0; i < 100; ++i) {
        auto events = many(1000, std::time(nullptr));
        history.append(events);
        largest = std::max(largest, sizeOnDisk());
    }
    EXPECT_LT(largest, 2U << 20);
    const auto numbers = kept::numbers(history.read({}, kAll));
    ASSERT_GT(numbers.size(), 1000U);
    EXPECT_EQ(numbers.back(), 100000U) << "the oldest go";
    EXPECT_EQ(numbers.back() - numbers.front() + 1, numbers.size());
    history.setLimits({std::chrono::hours(24), 100000});
    EXPECT_LT(sizeOnDisk(), 200000U) << "the file shrinks";
}

HOST_TEST(History, DropsWhatIsTooOld) {
    const std::time_t now = std::time(nullptr);
    History history(kPlace);
    auto old = many(700, now - 7200);
    history.append(old);
    auto unset = many(1, 0);  // the clock was not set yet
    history.append(unset);
    kept::append(history, kept::event("young", Event::Kind::alert, now));
    kept::append(history, kept::event("set back", Event::Kind::alert, now - 7200));
    history.setLimits({std::chrono::hours(1), std::uint64_t{64} << 20});
    EXPECT_EQ(history.limits().age, std::chrono::hours(1));
    EXPECT_THAT(kept::numbers(history.read({}, kAll)), ElementsAre(701, 702, 703));
}

HOST_TEST(History, IsTrimmedByWhatIsAppended) {
    History(kPlace).setLimits({std::chrono::hours(1), std::uint64_t{64} << 20});
    History history(kPlace);
    auto old = many(300, std::time(nullptr) - 7200);
    history.append(old);
    auto young = many(300, std::time(nullptr));
    history.append(young);
    EXPECT_EQ(kept::numbers(history.read({}, 1)), std::vector<std::uint64_t>{301});
}

}  // namespace
