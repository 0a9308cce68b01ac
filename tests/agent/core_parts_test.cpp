// What the agent is put together from, each part by itself.
#include <gmock/gmock.h>
#include <poll.h>

#include <algorithm>
#include <atomic>
#include <barrier>
#include <latch>
#include <limits>
#include <thread>
#include <type_traits>

#include "agent/cli/failure.h"
#include "agent/core/agent.h"
#include "agent/core/announcer.h"
#include "agent/core/process.h"
#include "agent/core/property_words.h"
#include "agent/core/running_plugins.h"
#include "tests/agent/node_list.h"
#include "tests/support/waiting.h"

namespace {

using namespace std::chrono_literals;
using cvagent::Agent;
using cvagent::ErrorLines;
using cvagent::ErrorScope;
using cvagent::Event;
using cvagent::EventLog;
using cvagent::Facts;
using cvagent::Handle;
using cvagent::NodeRef;
using cvagent::Pool;
using cvagent::Problem;
using cvagent::Reading;
using testing::ElementsAre;
using testing::IsEmpty;

// The rules of lifetime that a compiler can check: only the agent makes a NodeRef, there is no empty one, a
// temporary one gives nothing away, and there is one agent behind all that refer to it.
static_assert(!std::is_default_constructible_v<NodeRef>);
static_assert(!std::is_constructible_v<NodeRef, Handle>);
static_assert(!std::is_constructible_v<NodeRef, std::shared_ptr<void>, Handle>);
static_assert(!std::is_convertible_v<NodeRef, Handle>);
static_assert(std::is_copy_constructible_v<NodeRef> && std::is_nothrow_move_constructible_v<NodeRef>);
static_assert(!std::is_copy_constructible_v<Agent> && !std::is_move_constructible_v<Agent>);
template <class Reference>
concept GivesItsNode = requires(Reference&& node) {
    *std::forward<Reference>(node);
};
template <class Reference>
concept PointsToItsNode = requires(Reference&& node) {
    std::forward<Reference>(node).operator->();
};
static_assert(GivesItsNode<const NodeRef&> && PointsToItsNode<const NodeRef&>);
static_assert(!GivesItsNode<NodeRef> && !PointsToItsNode<NodeRef>);
static_assert(std::is_same_v<decltype(*std::declval<const NodeRef&>()), const IC::MutableNode&>);
template <class Process>
concept GivesSettings = requires(Process&& process) {
    std::forward<Process>(process).agentSettings();
};
static_assert(GivesSettings<const cvagent::PreparedProcess&> && !GivesSettings<cvagent::PreparedProcess>);

template <class Call>
Problem problemOf(const Call& call) {
    try {
        call();
    } catch (const Problem& problem) {
        return problem;
    }
    return {Problem::failed, "no problem"};
}

Event eventOf(Event::Kind kind, unsigned int node = 7) {
    Event event;
    event.kind = kind;
    event.nodeId = node;
    return event;
}

std::vector<std::uint64_t> numbersOf(const auto& events) {
    std::vector<std::uint64_t> numbers;
    for (const Event& event : events) {
        numbers.push_back(event.number);
    }
    return numbers;
}

cvagent::Subscription::Taken pastOf(EventLog& log, std::uint64_t after = 0) {
    return log.subscribe(after)->take();
}

TEST(EventLog, NumbersEventsAndKeepsTheLastOnes) {
    EventLog log(3);
    for (int i = 0; i < 5; ++i) {
        log.hear(eventOf(Event::Kind::alert));
    }
    EXPECT_THAT(numbersOf(pastOf(log).events), ElementsAre(3, 4, 5));
    EXPECT_EQ(pastOf(log).dropped, 2U);
    EXPECT_EQ(pastOf(log, 1).dropped, 1U);
    EXPECT_EQ(pastOf(log, 2).dropped, 0U);
    EXPECT_THAT(numbersOf(pastOf(log, 4).events), ElementsAre(5));
    EXPECT_THAT(pastOf(log, 5).events, IsEmpty());
    EXPECT_EQ(pastOf(log, 99).dropped, 0U);
    EXPECT_THAT(pastOf(log, 99).events, IsEmpty());
}

TEST(EventLog, KeepsAThousandPastEventsInMemory) {
    EventLog log;
    for (int i = 0; i < 1030; ++i) {
        log.hear(eventOf(Event::Kind::alert));
    }
    const auto past = pastOf(log);
    EXPECT_EQ(past.events.size(), 1024U);
    EXPECT_EQ(past.dropped, 6U);
}

TEST(EventLog, MissesNothingAfterANumberThatIsStillToCome) {
    EventLog log(3);
    log.hear(eventOf(Event::Kind::alert));
    const auto past = pastOf(log, std::numeric_limits<std::uint64_t>::max());
    EXPECT_THAT(past.events, IsEmpty());
    EXPECT_EQ(past.dropped, 0U);
}

TEST(EventLog, ASlowSubscriberLosesTheOldestAndIsToldHowMany) {
    EventLog log;
    const auto slow = log.subscribe(0, 2);
    const auto quick = log.subscribe(0);
    for (int i = 0; i < 5; ++i) {
        log.hear(eventOf(Event::Kind::alert));
    }
    const auto taken = slow->take();
    EXPECT_THAT(numbersOf(taken.events), ElementsAre(4, 5));
    EXPECT_EQ(taken.dropped, 3U);
    EXPECT_EQ(slow->take().dropped, 0U);
    EXPECT_THAT(numbersOf(quick->take().events), ElementsAre(1, 2, 3, 4, 5));
}

TEST(EventLog, ASubscriberGetsWhatHasHappenedAndWhatComes) {
    auto log = std::make_unique<EventLog>(2);
    for (int i = 0; i < 3; ++i) {
        log->hear(eventOf(Event::Kind::published));
    }
    const auto all = log->subscribe(0);
    const auto later = log->subscribe(2);
    const auto alerts = log->subscribe(0, 10, Event::Kind::alert);
    log->hear(eventOf(Event::Kind::alert));
    log.reset();  // the queues stay
    const auto taken = all->take();
    EXPECT_EQ(taken.dropped, 1U);
    EXPECT_THAT(numbersOf(taken.events), ElementsAre(2, 3, 4));
    EXPECT_THAT(numbersOf(later->take().events), ElementsAre(3, 4));
    EXPECT_THAT(numbersOf(alerts->take().events), ElementsAre(4));
}

TEST(EventLog, WhatASubscriberWouldNotHaveGotIsNotDropped) {
    EventLog log(3);
    for (int i = 0; i < 2; ++i) {
        log.hear(eventOf(Event::Kind::alert));
    }
    for (int i = 0; i < 8; ++i) {
        log.hear(eventOf(Event::Kind::published));
    }
    const auto droppedAfter = [&log](std::uint64_t number, std::optional<Event::Kind> only) {
        return log.subscribe(number, 10, only)->take().dropped;
    };
    EXPECT_EQ(droppedAfter(0, std::nullopt), 7U);
    EXPECT_EQ(droppedAfter(0, Event::Kind::alert), 2U);
    EXPECT_EQ(droppedAfter(1, Event::Kind::alert), 1U);
    EXPECT_EQ(droppedAfter(2, Event::Kind::alert), 0U);
    EXPECT_EQ(droppedAfter(0, Event::Kind::published), 5U);
    EXPECT_EQ(droppedAfter(5, Event::Kind::published), 2U);
    EXPECT_EQ(droppedAfter(0, Event::Kind::withdrawn), 0U);
}

TEST(EventLog, LongTextsDoNotFillTheMemory) {
    EventLog log;
    const auto slow = log.subscribe(0);
    Event event = eventOf(Event::Kind::alert);
    event.message = std::string(1 << 20, 'x');
    for (int i = 0; i < 40; ++i) {
        log.hear(event);
    }
    const auto taken = slow->take();
    EXPECT_EQ(taken.events.size() + taken.dropped, 40U);
    EXPECT_EQ(taken.events.size(), 15U);
    EXPECT_EQ(taken.events.back().number, 40U);
    EXPECT_EQ(pastOf(log).events.size(), 15U);
    EXPECT_EQ(pastOf(log).dropped, 25U);
    event.message = std::string(20 << 20, 'x');
    log.hear(event);
    EXPECT_THAT(numbersOf(slow->take().events), ElementsAre(41));
}

TEST(EventLog, SubscribersGoWhileEventsArrive) {
    EventLog log;
    std::atomic<bool> over{false};
    {
        std::vector<std::jthread> hearers;
        for (int i = 0; i < 2; ++i) {
            hearers.emplace_back([&] {
                while (!over) {
                    log.hear(eventOf(Event::Kind::alert));
                }
            });
        }
        for (int i = 0; i < 300; ++i) {
            const auto one = log.subscribe(1, 10);
            const auto events = one->take().events;
            EXPECT_TRUE(std::is_sorted(
                events.begin(), events.end(),
                [](const Event& left, const Event& right) { return left.number < right.number; }));
        }
        over = true;
    }
}

TEST(EventLog, TheDescriptorTellsWhenThereIsSomething) {
    EventLog log;
    const auto queue = log.subscribe(0);
    pollfd ready{queue->descriptor(), POLLIN, 0};
    EXPECT_EQ(poll(&ready, 1, 0), 0);
    log.hear(eventOf(Event::Kind::alert));
    EXPECT_EQ(poll(&ready, 1, 0), 1);
    queue->take();
    EXPECT_EQ(poll(&ready, 1, 0), 0);
}

TEST(ErrorLines, AreTheThreadsOwnersAndCounted) {
    ErrorLines outer;
    ErrorLines inner;
    EXPECT_EQ(ErrorScope::owner(), nullptr);
    {
        const ErrorScope scope(outer);
        {
            const ErrorScope nested(inner);
            EXPECT_EQ(ErrorScope::owner(), &inner);
            std::thread([] { EXPECT_EQ(ErrorScope::owner(), nullptr); }).join();
        }
        EXPECT_EQ(ErrorScope::owner(), &outer);
    }
    EXPECT_EQ(ErrorScope::owner(), nullptr);
    for (int i = 0; i < 62; ++i) {
        outer.add(i < 2 ? "twice" : "error " + std::to_string(i));
    }
    const auto taken = outer.take();
    EXPECT_EQ(taken.texts.size(), 50U);
    EXPECT_EQ(taken.texts.front(), "twice (2 times)");
    EXPECT_EQ(taken.lost, 11U);
    EXPECT_THAT(outer.take().texts, IsEmpty());
}

/// Work that waits until it is let go.
class Held {
public:
    void submitTo(Pool& pool, unsigned int lane, int count) {
        for (int i = 0; i < count; ++i) {
            pool.submit(lane, this, [this] {
                ++begun;
                go_.wait();
            });
        }
    }
    void waitFor(int count) const {
        while (begun < count) {
            std::this_thread::yield();
        }
    }
    void release() { go_.count_down(); }
    std::atomic<int> begun{0};

private:
    std::latch go_{1};
};

TEST(Pool, ALaneThatHangsLeavesTheOthersTheirThreads) {
    Held stuck;
    Pool pool(4, 2);
    stuck.submitTo(pool, 7, 10);
    stuck.waitFor(2);
    std::latch done(1);
    pool.submit(8, nullptr, [&done] { done.count_down(); });
    done.wait();
    EXPECT_EQ(stuck.begun, 2);
    stuck.release();
    stuck.waitFor(10);
}

TEST(Pool, ThreadsThatHangAreReplacedAndALaneThatHangsGetsNoMore) {
    Held stuck;
    Pool pool(2, 2);
    for (unsigned int lane = 1; lane <= 20; ++lane) {
        const int before = stuck.begun;
        stuck.submitTo(pool, lane, 3);
        stuck.waitFor(before + 1);
        pool.giveUp(&stuck);
    }
    std::latch done(1);
    pool.submit(99, nullptr, [&done] { done.count_down(); });
    done.wait();
    EXPECT_LE(stuck.begun, 40);
    EXPECT_LE(pool.threads(), 42U);
    const int before = stuck.begun;
    const int other = 0;
    std::atomic<bool> ran{false};
    pool.submit(7, &other, [&ran] { ran = true; });
    EXPECT_FALSE(pool.settle(20ms));
    EXPECT_FALSE(ran);
    EXPECT_EQ(stuck.begun, before);
    stuck.release();
    EXPECT_TRUE(pool.settle(10s));
    EXPECT_TRUE(ran);
    EXPECT_TRUE(eventually([&pool] { return pool.threads() <= 2; })) << pool.threads();
}

TEST(Pool, WhoWaitsSeesThatSlowThreadsAreReplaced) {
    Held slow;
    Pool pool(1, 1, {10ms, 1s});
    slow.submitTo(pool, 7, 1);
    std::mutex guard;
    std::condition_variable changed;
    bool done = false;
    pool.submit(8, nullptr, [&] {
        const std::lock_guard lock(guard);
        done = true;
        changed.notify_one();
    });
    std::unique_lock lock(guard);
    EXPECT_TRUE(pool.wait(changed, lock, Pool::Clock::now() + 10s, [&done] { return done; }));
    slow.release();
}

TEST(Pool, ALaneIsStuckWhenItsWorkWasGivenUpLongAgo) {
    Held held;
    Pool pool(1, 1, {10ms, 30ms});
    held.submitTo(pool, 7, 1);
    held.waitFor(1);
    std::this_thread::sleep_for(40ms);
    EXPECT_FALSE(pool.isStuck(7));
    pool.giveUp(&held);
    EXPECT_TRUE(pool.isStuck(7));
    EXPECT_FALSE(pool.isStuck(8));
    held.release();
    EXPECT_TRUE(pool.settle(10s));
    EXPECT_FALSE(pool.isStuck(7));
}

TEST(Pool, WhatWasNotBegunCanBeTakenBack) {
    Held stuck;
    {
        Pool pool(1, 1);
        stuck.submitTo(pool, 7, 3);
        stuck.waitFor(1);
        pool.giveUp(&stuck);
        std::latch done(1);
        pool.submit(8, nullptr, [&done] { done.count_down(); });
        stuck.release();
        done.wait();
    }
    EXPECT_EQ(stuck.begun, 1);
}

TEST(Pool, TellsWhenAllIsDone) {
    Held stuck;
    Pool pool(1, 1);
    EXPECT_TRUE(pool.settle(0ms));
    stuck.submitTo(pool, 7, 2);
    EXPECT_FALSE(pool.settle(1ms));
    stuck.release();
    EXPECT_TRUE(pool.settle(10s));
    EXPECT_EQ(stuck.begun, 2);
}

TEST(Pool, MayBeEndedByItsOwnWork) {
    auto pool = std::make_shared<Pool>(2, 2);
    Pool& same = *pool;
    std::latch done(1);
    const std::shared_ptr<void> last(nullptr, [&done](void*) { done.count_down(); });
    same.submit(1, nullptr, [held = std::move(pool), last] {});
    const_cast<std::shared_ptr<void>&>(last).reset();
    done.wait();
}

TEST(Facts, KeepTheLastValueOfWhatWasCutOff) {
    IC::MutableNode node(7, 0, {1}, 40, 0);
    Facts facts;
    facts.meet(7);
    EXPECT_TRUE(facts.known(node, 5).failed());
    const auto begun = Facts::Clock::now();
    Reading good{5, {}, IC::PropertyValue("old", true), {}};
    facts.judge(node, good, begun);
    EXPECT_EQ(good.asOf, begun);
    EXPECT_FALSE(good.stale);
    Reading cut{5, {}, {}, "timed out", false, true};
    facts.judge(node, cut, Facts::Clock::now());
    EXPECT_EQ(static_cast<std::string>(cut.value), "old");
    EXPECT_TRUE(cut.stale);
    EXPECT_EQ(cut.asOf, begun);
    EXPECT_TRUE(facts.known(node, 5).stale);
    EXPECT_FALSE(facts.known(node, 5).failed());
    Reading again{5, {}, IC::PropertyValue("new", true), {}};
    facts.judge(node, again, Facts::Clock::now());
    EXPECT_EQ(static_cast<std::string>(facts.known(node, 5).value), "new");
    EXPECT_FALSE(facts.known(node, 5).stale);
}

/// A node whose property 5 has answered "young" to a read that began a second after `earlier`.
class FactsOfAYoungAnswer : public testing::Test {
protected:
    FactsOfAYoungAnswer() {
        facts.meet(7);
        Reading young{5, {}, IC::PropertyValue("young", true), {}};
        facts.judge(node, young, earlier + 1s);
    }

    const IC::MutableNode node{7, 0, {1}, 40, 0};
    const Facts::Clock::time_point earlier = Facts::Clock::now();
    Facts facts;
};

TEST_F(FactsOfAYoungAnswer, DoNotChangeByAnOlderAnswerThatComesLate) {
    Reading old{5, {}, IC::PropertyValue("old", true), {}};
    facts.judge(node, old, earlier);
    EXPECT_EQ(static_cast<std::string>(facts.known(node, 5).value), "young");
}

TEST_F(FactsOfAYoungAnswer, StayGoodWhenAnOlderReadIsCutOff) {
    Reading cut{5, {}, {}, "timed out", false, true};
    facts.judge(node, cut, earlier);
    EXPECT_EQ(static_cast<std::string>(cut.value), "young");
    EXPECT_FALSE(facts.known(node, 5).stale);
    facts.overdue(node, 5, earlier);
    EXPECT_FALSE(facts.known(node, 5).stale);
    facts.overdue(node, 5, earlier + 1s);
    EXPECT_TRUE(facts.known(node, 5).stale);
}

TEST(Facts, WhatTheNodeStoresIsKnownFromTheStartOn) {
    IC::MutableNode node(7, 0, {1}, 40, 0);
    node.setProperty(5, IC::PropertyValue("stored", true));
    Facts facts;
    const auto before = Facts::Clock::now();
    facts.meet(7);
    EXPECT_EQ(static_cast<std::string>(facts.known(node, 5).value), "stored");
    EXPECT_GE(facts.known(node, 5).asOf, before);
    EXPECT_TRUE(facts.overdue(node, 5, Facts::Clock::now()).stale);
    EXPECT_EQ(static_cast<std::string>(facts.overdue(node, 5, Facts::Clock::now()).value), "stored");
    EXPECT_FALSE(facts.overdue(node, 6, Facts::Clock::now()).stale);
    facts.forget(7);
    EXPECT_EQ(facts.known(node, 5).asOf, std::nullopt);
}

/// An interface as plug-ins build theirs.
class Ports : public NodeList {
public:
    IC::MutableNode* addPort(const char* name) {
        const Handle node = hold(add(12, 0));
        node->MutableNode::setProperty(123, IC::PropertyValue(IC::Number(1U), true));
        node->setPath(std::string("/network-port:") + name);
        return node.get();
    }
};

/// An announcer that knows of one port, eth0.
class Announcer : public testing::Test {
protected:
    Announcer() { announcer.takeStock(ports); }

    Ports ports;
    const IC::MutableNode* const port = ports.addPort("eth0");
    EventLog log{EventLog::kMost};
    Facts facts;
    cvagent::Announcer announcer{log, facts};
};

TEST_F(Announcer, TellsOfANodeOnceWhoeverSeesItFirst) {
    announcer.announceNew(ports);
    EXPECT_THAT(pastOf(log).events, IsEmpty());
    const IC::MutableNode* const made = ports.addPort("eth1");
    announcer.announceNew(ports);
    announcer.announceNew(ports);
    announcer.hear(cvagent::nodeEvent(Event::Kind::published, *made));
    ASSERT_EQ(pastOf(log).events.size(), 1U);
    EXPECT_EQ(pastOf(log).events.front().path, "/network-port:eth1");
    announcer.hear(cvagent::nodeEvent(Event::Kind::withdrawn, *made));
    EXPECT_EQ(pastOf(log).events.size(), 2U);
}

TEST_F(Announcer, AnAlertTellsTheStateBeforeAndAfter) {
    for (const auto& [code, message] : std::vector<std::pair<unsigned int, std::string>>{
             {12, "NIC is Offline "}, {1, "NIC is Online "}, {32, "NIC has Switched Over "}}) {
        announcer.hear(
            cvagent::alertEvent(IC::Alert(1, 0, {"/network-port:eth0"}, code, message), ports.holdAll()));
    }
    announcer.hear(
        cvagent::alertEvent(IC::Alert(1, 0, {"/nowhere"}, 12, "NIC is Offline "), ports.holdAll()));
    std::vector<std::string> changes;
    for (const Event& event : pastOf(log).events) {
        changes.push_back(event.nodeClass + " " + event.propertyName + " " + event.before + " " +
                          event.after);
    }
    EXPECT_THAT(changes, ElementsAre("network-port LinkState 1 12", "network-port LinkState 12 1",
                                     "network-port LinkState 1 32", "   "));
}

TEST_F(Announcer, SuccessiveAlertsAreAChain) {
    const auto alertAgain = [&](unsigned int code, const std::string& message) {
        for (int i = 0; i < 1000; ++i) {
            announcer.hear(
                cvagent::alertEvent(IC::Alert(1, 0, {"/network-port:eth0"}, code, message), ports.holdAll()));
        }
    };
    {
        const std::jthread one(alertAgain, 12, "NIC is Offline ");
        const std::jthread other(alertAgain, 1, "NIC is Online ");
        const std::jthread reader([&] {
            for (int i = 0; i < 1000; ++i) {
                Reading reading{123, {}, IC::PropertyValue(IC::Number(7U), true), {}};
                facts.judge(*port, reading, Facts::Clock::now());
            }
        });
    }
    const auto events = pastOf(log).events;
    ASSERT_EQ(events.size(), 2000U);
    for (std::size_t i = 1; i < events.size(); ++i) {
        ASSERT_EQ(events[i].before, events[i - 1].after) << i;
    }
}

/// What a plug-in's threads ask while others come and go: each look at a name leads to looks at paths.
TEST(RunningPlugins, LooksGoOnWhileOthersComeAndGo) {
    Ports ports;
    ports.add(40, 0);  // no path was made for it
    const cvagent::RunningPlugin running(ports);
    std::atomic<bool> over{false};
    std::vector<std::jthread> askers;
    std::atomic<int> found{0};
    for (int i = 0; i < 3; ++i) {
        askers.emplace_back([&] {
            while (!over) {
                IC::Node* node = nullptr;
                found += running.finder()("/computer", &node).getStatus() == 0 ? 1 : 0;
            }
        });
    }
    for (int i = 0; i < 500 || found == 0; ++i) {
        NodeList other;
        const cvagent::RunningPlugin comesAndGoes(other);
        EXPECT_EQ(comesAndGoes.ids().interfaceId, 2U);
    }
    over = true;
}

TEST(Problems, HaveTheirExitStatusAndAdviceAtTheEdgeAlone) {
    using cvagent::ExitStatus;
    using cvagent::Failure;
    const auto statusOf = [](Problem::Kind kind) { return Failure(Problem(kind, "x")).status(); };
    EXPECT_EQ(statusOf(Problem::notFound), ExitStatus::notFound);
    EXPECT_EQ(statusOf(Problem::ambiguous), ExitStatus::notFound);
    EXPECT_EQ(statusOf(Problem::refused), ExitStatus::refused);
    EXPECT_EQ(statusOf(Problem::busy), ExitStatus::busy);
    EXPECT_EQ(statusOf(Problem::timedOut), ExitStatus::failed);
    EXPECT_EQ(statusOf(Problem::failed), ExitStatus::failed);
    const IC::MutableNode node(7, 0, {1}, 40, 0);
    try {
        cvagent::writableRow(node, "NoSuch");
        FAIL();
    } catch (const Problem& problem) {
        EXPECT_STREQ(problem.what(), "a computer has no property 'NoSuch'");
        EXPECT_STREQ(Failure(problem).what(),
                     "a computer has no property 'NoSuch'; see: cvagent properties computer");
    }
}

TEST(Failures, HaveTheAdviceForTheirKindAndSubject) {
    const auto shown = [](Problem::Kind kind, Problem::Subject subject, const std::string& detail = "") {
        return std::string(cvagent::Failure(Problem(kind, "it", subject, detail)).what());
    };
    EXPECT_EQ(shown(Problem::notFound, Problem::node), "it; see: cvagent tree");
    EXPECT_EQ(shown(Problem::ambiguous, Problem::node, "\n  5  /a"),
              "it; give the id or the path of one of them:\n  5  /a");
    EXPECT_EQ(shown(Problem::busy, Problem::dataFixed, "; why"), "it\nStop it first; why");
    EXPECT_EQ(shown(Problem::busy, Problem::dataOwn),
              "it\nStop it first, or name another one with CORVISTA_DATA_DIR=DIRECTORY");
    EXPECT_EQ(
        shown(Problem::failed, Problem::dataOwn),
        "it\nMake all of the way to it yours or root's and writable by nobody else, or name another one "
        "with CORVISTA_DATA_DIR=DIRECTORY");
    EXPECT_EQ(shown(Problem::busy, Problem::none), "it");
}

TEST(PropertyWords, NameAClassWithItsArticle) {
    const IC::MutableNode node(7, 0, {1}, 29, 0);
    EXPECT_EQ(cvagent::Failure(problemOf([&] { cvagent::writableRow(node, "NoSuch"); })).what(),
              std::string("an ip-config has no property 'NoSuch'; see: cvagent properties ip-config"));
    EXPECT_STREQ(problemOf([&] { cvagent::writableRow(node, "DHCPServers"); }).what(),
                 "DHCPServers of an ip-config cannot be written");
}

TEST(PropertyWords, WhatStopsTheHostIsKnownByItsCode) {
    const auto labelOf = [](unsigned int id, unsigned int code) {
        const cvagent::Label* const label = cvagent::drasticLabel(
            *cvagent::findProperty(40, id), IC::PropertyValue(IC::EnumValue(code), true));
        return std::string(label != nullptr ? label->text : "");
    };
    EXPECT_EQ(labelOf(123, 9), "restart");
    EXPECT_EQ(labelOf(123, 12), "halt");
    EXPECT_EQ(labelOf(123, 1), "");
    const IC::PropertyValue down(IC::Number(12U), true);
    EXPECT_EQ(cvagent::drasticLabel(*cvagent::findProperty(29, 123), down), nullptr);
    const IC::PropertyValue text("2026-11-20T21:03:03Z", true);
    EXPECT_EQ(cvagent::drasticLabel(*cvagent::findProperty(40, 126), text), nullptr);
}

TEST(Catalogue, ATableThatCollidesIsRefused) {
    static constexpr cvagent::NodeClass kSameNumber[] = {
        {cvagent::NodeType::computer, "sensor", cvagent::NodeClass::Naming::single, 0}};
    static constexpr cvagent::NodeClass kSameName[] = {
        {cvagent::NodeType{301}, "computer", cvagent::NodeClass::Naming::single, 0}};
    static constexpr cvagent::Property kSameProperty[] = {
        {cvagent::NodeType::computer, 108, "Other", cvagent::Kind::text, cvagent::Unit::none, {}, ""}};
    const std::size_t before = cvagent::nodeClasses().size();
    EXPECT_THROW(cvagent::addToCatalogue({"a", kSameNumber, {}, {}}), std::logic_error);
    EXPECT_THROW(cvagent::addToCatalogue({"a", kSameName, {}, {}}), std::logic_error);
    EXPECT_THROW(cvagent::addToCatalogue({"a", {}, {kSameProperty}, {}}), std::logic_error);
    EXPECT_EQ(cvagent::nodeClasses().size(), before);
}

}  // namespace
