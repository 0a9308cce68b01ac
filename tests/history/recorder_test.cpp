// What becomes of events while a history cannot be written.
#include <gmock/gmock.h>

#include "agent/history/recorder.h"
#include "tests/history/kept.h"
#include "tests/support/fake_host.h"

namespace {

using cvagent::Event;
using cvagent::History;
using cvagent::Recorder;
using kept::kPlace;
using testing::ElementsAre;
using testing::IsEmpty;
using testing::SizeIs;
using testing::StartsWith;

constexpr std::size_t kAll = 1000000;

class Told {
public:
    cvagent::Tell teller() {
        return [this](const std::string& line) { lines.push_back(line); };
    }
    std::vector<std::string> lines;
};

std::uint64_t keepOne(Recorder& recorder, const Event& event) {
    std::vector<Event> events = {event};
    recorder.keep(events);
    return events.front().number;
}

HOST_TEST(Recorder, MakesNothingBeforeTheFirstEvent) {
    Recorder recorder([] { return kPlace; }, cvagent::tellNobody);
    recorder.settle();
    EXPECT_FALSE(host.exists("/var/lib/corvista"));
    EXPECT_EQ(keepOne(recorder, kept::event("x")), 1U);
    EXPECT_THAT(kept::messages(History(kPlace).read({}, kAll)), ElementsAre("x"));
}

HOST_TEST(Recorder, KeepsLaterWhatCouldNotBeKept) {
    Told told;
    {
        Recorder recorder([] { return kPlace; }, told.teller());
        EXPECT_EQ(recorder.open(), 0U);
        EXPECT_EQ(keepOne(recorder, kept::event("first")), 1U);
        host.readOnly("/var/lib/corvista");
        EXPECT_EQ(keepOne(recorder, kept::event("second")), 2U);
        EXPECT_EQ(keepOne(recorder, kept::event("third")), 3U);
        ASSERT_THAT(told.lines, SizeIs(1)) << "once";
        EXPECT_THAT(told.lines.front(), StartsWith("what happens is not kept in the history: "));
        host.restore("/var/lib/corvista");
    }
    EXPECT_THAT(kept::messages(History(kPlace).read({}, kAll)), ElementsAre("first", "second", "third"));
    ASSERT_THAT(told.lines, SizeIs(2));
    EXPECT_EQ(told.lines.back(), "the history is kept again");
}

HOST_TEST(Recorder, KeepsOnceWhatItKeepsLater) {
    Told told;
    Recorder recorder([] { return kPlace; }, told.teller(), std::chrono::milliseconds(0));
    keepOne(recorder, kept::event("first"));
    host.readOnly("/var/lib/corvista");
    keepOne(recorder, kept::event("second"));
    host.restore("/var/lib/corvista");
    EXPECT_EQ(keepOne(recorder, kept::event("third")), 3U);
    EXPECT_EQ(keepOne(recorder, kept::event("fourth")), 4U);
    EXPECT_THAT(kept::numbers(History(kPlace).read({}, kAll)), ElementsAre(1, 2, 3, 4));
    EXPECT_THAT(told.lines, SizeIs(2));
}

HOST_TEST(Recorder, NumbersEventsThoughThereIsNoPlaceForThem) {
    Told told;
    host.readOnly("/var");
    {
        Recorder recorder([] { return kPlace; }, told.teller());
        EXPECT_EQ(keepOne(recorder, kept::event("a")), 1U);
        EXPECT_EQ(keepOne(recorder, kept::event("b")), 2U);
    }
    EXPECT_THAT(told.lines, SizeIs(1));
}

HOST_TEST(Recorder, SettlesWhatItHasKept) {
    {
        Recorder recorder([] { return kPlace; }, cvagent::tellNobody);
        keepOne(recorder, kept::alert("NIC is Offline "));
        recorder.settle();
    }
    Recorder recorder([] { return kPlace; }, cvagent::tellNobody);
    EXPECT_EQ(keepOne(recorder, kept::alert("NIC is Offline ")), 2U);
}

}  // namespace
