#include "indications/network_monitor.h"

#include <gmock/gmock.h>

#include <algorithm>
#include <atomic>
#include <mutex>
#include <optional>
#include <semaphore>
#include <thread>

#include "tests/indications/heard.h"
#include "tests/indications/interfaces.h"
#include "tests/support/failing_new.h"
#include "tests/support/fake_host.h"
#include "tests/support/log_capture.h"
#include "tests/support/no_threads.h"
#include "tests/support/texts_are.h"
#include "tests/support/waiting.h"
#include "tests/support/waits.h"

namespace {

using namespace std::chrono_literals;
using testing::Contains;
using testing::Each;

constexpr char kFile[] = "/opt/vantrel/corvista/data/oshwminetind.dat";

/// An interface that does not answer until the test lets it, and not for want of a command.
class SlowNode : public IC::MutableNode {
public:
    SlowNode() : MutableNode(300, 1, {1}, 12, 0) {}
    IC::Error getProperty(unsigned int, IC::PropertyValue&) const override {
        asked_ = true;
        answer_.acquire();
        return {1, IC::Number(), "late"};
    }
    bool asked() const { return asked_; }
    void letAnswer() const { answer_.release(); }

private:
    mutable std::atomic<bool> asked_{false};
    mutable std::counting_semaphore<> answer_{0};
};

/// What stopping a monitor says that is held up for so many seconds.
std::vector<std::string> stopHeldUp(unsigned int seconds) {
    QX::setClockSpeed(100);  // a second passes in 10 ms
    Interfaces interfaces;
    auto* slow = new SlowNode;
    IC::OsHwMITestAccess::addInterface(interfaces.mi(), "eth0", slow);
    Waits waits;
    interfaces.mi().enableIndications();
    EXPECT_TRUE(eventually([&] { return slow->asked(); }));
    unsigned int waited = 0;
    waits.whenWeWait([&](double length) {
        if (length == 1 && waited++ == seconds) {
            slow->letAnswer();
        }
    });
    LogCapture capture;
    interfaces.mi().disableIndications();
    const auto messages = capture.ownMessages();
    slow->letAnswer();
    EXPECT_EQ(capture.ownMessages(3000), messages);
    return messages;
}

HOST_TEST(NetworkMonitor, RaisesEachChangeOnceAndKeepsTheStateAcrossARestart) {
    host.directory("/opt/vantrel/corvista/data");
    QX::setClockSpeed(10'000);  // 30 seconds pass in 3 ms
    const Waits waits;
    const auto somePasses = [&] { return waits.othersBegin(waits.others().size() + 4); };
    Interfaces interfaces;
    auto& eth0 = interfaces.add("eth0", 1);
    Heard heard;
    interfaces.mi().registerForAlerts(Heard::hear, &heard);
    interfaces.mi().enableIndications();
    ASSERT_TRUE(eventually([&] { return host.read(kFile) == "eth0=1\n"; }));
    eth0.is(12);
    ASSERT_TRUE(eventually([&] { return !heard.now().empty(); }));
    ASSERT_TRUE(somePasses());
    EXPECT_THAT(heard.now(), TextsAre("NIC is Offline "));
    interfaces.mi().disableIndications();
    EXPECT_EQ(host.read(kFile), "eth0=12\n");
    eth0.is(1);
    interfaces.mi().enableIndications();
    ASSERT_TRUE(eventually([&] { return heard.now().size() == 2; }));
    ASSERT_TRUE(somePasses());
    EXPECT_THAT(heard.now(), TextsAre("NIC is Offline ", "NIC is Online "));
    interfaces.mi().disableIndications();
}

/// How many passes have begun.
auto passes(const LogCapture& capture) {
    const auto messages = capture.messages();
    return std::count(messages.begin(), messages.end(), "OsHwMI::createCurNetNodeMap(): entry");
}

HOST_TEST(NetworkMonitor, LooksEveryThirtySeconds) {
    QX::setClockSpeed(10'000);
    const Waits waits;
    Interfaces interfaces;
    LogCapture capture;
    interfaces.mi().enableIndications();
    ASSERT_TRUE(waits.othersBegin(3));
    EXPECT_GE(passes(capture), 3);
    interfaces.mi().disableIndications();
    EXPECT_THAT(waits.others(), Each(30));
}

HOST_TEST(NetworkMonitor, TellsOfAnInterfaceAgainWhenItHasLeftItsBond) {
    host.directory("/opt/vantrel/corvista/data");
    host.file("/proc/net/bonding/bond0", "Slave Interface: eth0\n");
    QX::setClockSpeed(1000);
    Interfaces interfaces;
    auto& eth0 = interfaces.add("eth0", 1);
    interfaces.add("bond0", 1);
    Heard heard;
    interfaces.mi().registerForAlerts(Heard::hear, &heard);
    LogCapture capture;
    interfaces.mi().enableIndications();
    ASSERT_TRUE(eventually([&] { return host.read(kFile) == "bond0=1\neth0=1\n"; }));
    host.remove("/proc/net/bonding/bond0");
    const auto before = passes(capture);
    ASSERT_TRUE(eventually([&] { return passes(capture) >= before + 2; }));
    eth0.is(12);
    EXPECT_TRUE(eventually([&] { return !heard.now().empty(); }));
    interfaces.mi().disableIndications();
    EXPECT_THAT(heard.now(), TextsAre("NIC is Offline "));
}

/// A stop sleeps when it has asked its thread to end. Has it sleep until that has ended: how soon the woken
/// thread gets a processor decides otherwise whether it is aborted and waited for.
void letTheThreadEndFirst(Waits& waits, const LogCapture& capture) {
    waits.whenWeWait([&](double seconds) {
        EXPECT_TRUE(seconds == 0 ||
                    eventually([&] { return capture.messages().back() == "NetworkMonitor: run exit"; }));
    });
}

HOST_TEST(NetworkMonitor, StopsAtOnceInTheMiddleOfItsWait) {
    QX::setClockSpeed(0.1);  // whoever waits for the monitor's wait does so for five minutes
    const LogCapture capture;
    Waits waits;
    letTheThreadEndFirst(waits, capture);
    Interfaces interfaces;
    interfaces.mi().enableIndications();
    ASSERT_TRUE(waits.othersBegin(1)) << "the first pass is over";
    interfaces.mi().disableIndications();
    EXPECT_EQ(waits.others().size(), 1U);
    EXPECT_THAT(
        capture.ownMessages(),
        TextsAre("enableIndications: entry", "Creating NetworkMonitor thread.",
                 "NetworkMonitor::NetworkMonitor: entry", "NetworkMonitor::NetworkMonitor: exit",
                 "NetworkMonitor thread created.", "enableIndications: exit", "disableIndications: entry",
                 "eventThreadNetIndications: Stopping thread...", "NetworkMonitor::stop: entry",
                 "NetworkMonitor::stop: exit", "eventThreadNetIndicationsThread terminated.",
                 "NetworkMonitor::~NetworkMonitor: entry", "NetworkMonitor::~NetworkMonitor: exit",
                 "disableIndications: exit"));
    EXPECT_THAT(capture.messages(3000), Contains("NetworkMonitor: run entry"));
    EXPECT_THAT(capture.messages(3000), Contains("NetworkMonitor: run exit"));
}

HOST_TEST(NetworkMonitor, IsAbortedInTheMiddleOfACommandAndReportsNothingOfThatPass) {
    host.file(kFile, "bond0=1\neth1=1\n");
    host.file("/proc/net/bonding/bond0", "Slave Interface: eth0\n");
    host.tool("grep %any", ToolAnswer{"", 0, "", 600'000});  // a tool that hangs
    Interfaces interfaces;
    interfaces.add("bond0", 12);
    interfaces.add("eth1", 12);
    Heard heard;
    interfaces.mi().registerForAlerts(Heard::hear, &heard);
    LogCapture capture;
    interfaces.mi().enableIndications();
    ASSERT_TRUE(eventually([&] { return !host.callsOf("grep").empty(); }));
    interfaces.mi().disableIndications();
    EXPECT_THAT(capture.ownMessages(), Contains("eventThreadNetIndications: Aborting thread..."));
    EXPECT_THAT(capture.ownMessages(), Contains("eventThreadNetIndicationsThread terminated."));
    EXPECT_TRUE(heard.now().empty());
    EXPECT_THAT(capture.messages(6000), testing::IsEmpty()) << "the stop itself ended the command";
    EXPECT_EQ(host.read(kFile), "bond0=1\neth1=1\n");
}

HOST_TEST(NetworkMonitor, TellsOfTheOthersWhileOneHangs) {
    host.file(kFile, "eth0=1\neth1=1\n");
    Interfaces interfaces;
    interfaces.add<AskedNode>("eth0", 12).hangs = true;
    interfaces.add("eth1", 12);
    Heard heard;
    interfaces.mi().registerForAlerts(Heard::hear, &heard);
    LogCapture capture;
    interfaces.mi().enableIndications();
    ASSERT_TRUE(eventually([&] { return host.read(kFile) == "eth0=1\neth1=12\n"; }));
    interfaces.mi().disableIndications();
    EXPECT_THAT(heard.now(), TextsAre("NIC is Offline "));
    EXPECT_THAT(capture.messages(6000),
                TextsAre("Link state of eth0 not told, a command was ended: it stays as it was"));
}

HOST_TEST(NetworkMonitor, IsWaitedForAndTheSecondsAreCounted) {
    const auto messages = stopHeldUp(1);
    EXPECT_THAT(messages, Contains("eventThreadNetIndications: Waiting for thread 0 seconds so far"));
    EXPECT_THAT(messages, Contains("eventThreadNetIndications: Waiting for thread 1 seconds so far"));
    EXPECT_THAT(messages, Contains("eventThreadNetIndicationsThread terminated."));
}

HOST_TEST(NetworkMonitor, IsWaitedForTenTimesAtTheMost) {
    const auto messages = stopHeldUp(11);
    EXPECT_THAT(messages, Contains("eventThreadNetIndications: Waiting for thread 9 seconds so far"));
    EXPECT_THAT(messages,
                testing::Not(Contains("eventThreadNetIndications: Waiting for thread 10 seconds so far")));
    EXPECT_THAT(messages, Contains("eventThreadNetIndications termination failed."));
}

/// An agent whose first alert is not answered until the test lets it go on.
struct Stuck {
    std::atomic<int> calls{0};
    std::atomic<bool> go{false};

    static IC::Error hear(const std::vector<IC::Alert>&, const void* context) {
        auto* stuck = const_cast<Stuck*>(static_cast<const Stuck*>(context));
        if (++stuck->calls == 1) {
            while (!stuck->go) {
                std::this_thread::sleep_for(1ms);
            }
        }
        return {};
    }
};

HOST_TEST(NetworkMonitor, IsLeftWhenACallbackHangsForEver) {
    std::thread([] {}).join();  // what a sanitizer starts beside the first thread of a process
    const std::size_t before = runningThreads();
    host.file(kFile, "eth0=12\neth1=12\n");
    Stuck stuck;
    LogCapture capture;
    {
        Interfaces interfaces;
        interfaces.add("eth0", 1);
        interfaces.add("eth1", 1);
        interfaces.mi().registerForAlerts(Stuck::hear, &stuck);
        interfaces.mi().enableIndications();
        ASSERT_TRUE(eventually([&] { return stuck.calls == 1; }));
        QX::setClockSpeed(100);  // a second passes in 10 ms
        const Waits waits;
        EXPECT_EQ(interfaces.mi().unload().getStatus(), 0);
        EXPECT_THAT(waits.ours(), Contains(1).Times(10));
    }
    EXPECT_THAT(capture.ownMessages(), Contains("eventThreadNetIndications termination failed."));
    EXPECT_THAT(capture.ownMessages(),
                Contains(testing::StartsWith("eventThreadNetIndications: Waiting for thread ")).Times(10));
    QX::setClockSpeed(1);
    {
        Interfaces next;  // a new start beside the thread of the last one
        next.add("eth0", 12);
        next.add("eth1", 12);
        next.mi().enableIndications();
        ASSERT_TRUE(eventually([&] {
            const auto said = capture.messages();
            return std::ranges::find(said, "writePrevNetNodeMap: exit") != said.end();
        })) << "the first pass is over";
        const auto lines = capture.messages().size();
        stuck.go = true;
        EXPECT_TRUE(eventually([&] { return runningThreads() == before + 1; }));
        EXPECT_EQ(stuck.calls, 1) << "the agent was told of a stop: no alert comes after it";
        EXPECT_EQ(capture.messages().size(), lines) << "and no line";
        EXPECT_EQ(host.read(kFile), "eth0=12\neth1=12\n");
        EXPECT_FALSE(IC::OsHwMITestAccess::networkMonitorEnded(next.mi()));
        capture.clear();
    }
    EXPECT_THAT(capture.ownMessages(), Contains("eventThreadNetIndicationsThread terminated."));
}

HOST_TEST(NetworkMonitor, ThatWasLeftMayOutliveTheProgramsEnd) {
    host.file(kFile, "eth0=12\n");
    static Stuck stuck;  // until the process has gone
    Interfaces interfaces;
    interfaces.add("eth0", 1);
    interfaces.mi().registerForAlerts(Stuck::hear, &stuck);
    interfaces.mi().enableIndications();
    ASSERT_TRUE(eventually([&] { return stuck.calls == 1; }));
    QX::setClockSpeed(1000);
    interfaces.mi().disableIndications();
}

/// An agent that has enough after one alert, and says so while it is told.
IC::Error stopAll(const std::vector<IC::Alert>&, const void* context) {
    auto* calls = const_cast<std::atomic<int>*>(static_cast<const std::atomic<int>*>(context));
    IC::myoshwmi.deRegisterForAlerts();
    EXPECT_EQ(IC::myoshwmi.unload().getStatus(), 0);
    ++*calls;
    return {};
}

HOST_TEST(NetworkMonitor, MayBeStoppedByTheCallbackThatItCalls) {
    std::thread([] {}).join();
    const std::size_t before = runningThreads();
    host.file(kFile, "eth0=12\neth1=12\n");
    host.file("/tmp/fdisk_tmp", "");
    Interfaces interfaces;
    interfaces.add("eth0", 1);
    interfaces.add("eth1", 1);
    std::atomic<int> calls{0};
    interfaces.mi().registerForAlerts(stopAll, &calls);
    const Waits waits;
    interfaces.mi().enableIndications();
    ASSERT_TRUE(eventually([&] { return calls == 1 && runningThreads() == before; }));
    EXPECT_THAT(waits.others(), Each(testing::Lt(1))) << "it does not wait for itself";
    EXPECT_EQ(calls, 1);
    EXPECT_EQ(host.read(kFile), "eth0=12\neth1=12\n") << "of the second change nobody was told";
    EXPECT_FALSE(host.exists("/tmp/fdisk_tmp")) << "the stop has run its commands";
    EXPECT_FALSE(IC::OsHwMITestAccess::hasInventory());
}

HOST_TEST(NetworkMonitor, StartedAgainIsNotTakenForTheOneThatEnded) {
    const LogCapture capture;
    Waits waits;
    letTheThreadEndFirst(waits, capture);
    Interfaces interfaces;
    for (int start = 0; start < 2; ++start) {
        interfaces.mi().enableIndications();
        EXPECT_FALSE(IC::OsHwMITestAccess::networkMonitorEnded(interfaces.mi()))
            << "or the stop would not wait its whole first second";
        interfaces.mi().disableIndications();
    }
}

HOST_TEST(NetworkMonitor, LeavesIndicationsOffWhenItsThreadWillNotStart) {
    Interfaces interfaces;
    LogCapture capture;
    {
        const NoThreads none;
        interfaces.mi().enableIndications();
    }
    EXPECT_THAT(capture.ownMessages(), Contains("NetworkMonitor thread failed."));
    capture.clear();
    interfaces.mi().disableIndications();
    EXPECT_THAT(capture.ownMessages(), TextsAre("disableIndications: entry", "disableIndications: exit"));
}

/// What starting the monitor says when it cannot be made.
std::vector<std::string> startFailing(void (*fail)()) {
    Interfaces interfaces;
    LogCapture capture;
    {
        const FailingNew none(sizeof(IC::NetworkMonitor), fail);
        interfaces.mi().enableIndications();
    }
    EXPECT_EQ(capture.ownMessages(6000).size(), 1U);
    return capture.ownMessages();
}

HOST_TEST(NetworkMonitor, ThatCannotBeMadeIsLoggedWithTheReason) {
    EXPECT_THAT(startFailing([] { throw std::bad_alloc(); }),
                TextsAre("enableIndications: entry", "Creating NetworkMonitor thread.",
                         "OsHwMIInd Caught std::bad_alloc Type St9bad_alloc", "enableIndications: exit"));
    EXPECT_THAT(startFailing([] { throw 7; }),
                TextsAre("enableIndications: entry", "Creating NetworkMonitor thread.",
                         "OsHwMIInd Caught unknown exception", "enableIndications: exit"));
}

/// An interface that throws when it is asked: a number, then exceptions.
class ThrowingNode : public IC::MutableNode {
public:
    ThrowingNode() : MutableNode(300, 1, {1}, 12, 0) {}
    IC::Error getProperty(unsigned int, IC::PropertyValue&) const override {
        if (++calls_ == 1) {
            throw 7;
        }
        throw std::runtime_error("the host is broken");
    }
    int calls() const { return calls_; }

private:
    mutable std::atomic<int> calls_{0};
};

HOST_TEST(NetworkMonitor, GoesOnWhateverAPassThrows) {
    QX::setClockSpeed(1000);
    Interfaces interfaces;
    auto* broken = new ThrowingNode;
    IC::OsHwMITestAccess::addInterface(interfaces.mi(), "eth0", broken);
    LogCapture capture;
    interfaces.mi().enableIndications();
    EXPECT_TRUE(eventually([&] { return broken->calls() >= 3; }));
    interfaces.mi().disableIndications();
    EXPECT_THAT(capture.messages(6000), Contains("OsHwMIInd Caught unknown exception").Times(1));
    EXPECT_THAT(capture.messages(6000),
                Contains("OsHwMIInd Caught the host is broken Type St13runtime_error"));
}

/// The state file as it stood when the first alert came.
struct FileAtTheAlert {
    const FakeHost& host;
    std::mutex guard = {};
    std::optional<std::string> content = {};

    static IC::Error hear(const std::vector<IC::Alert>&, const void* context) {
        auto* file = const_cast<FileAtTheAlert*>(static_cast<const FileAtTheAlert*>(context));
        const std::lock_guard lock(file->guard);
        file->content = file->content ? file->content : file->host.read(kFile);
        return {};
    }
    std::optional<std::string> now() {
        const std::lock_guard lock(guard);
        return content;
    }
};

HOST_TEST(NetworkMonitor, KeepsANewStateOnlyWhenTheAgentHasBeenTold) {
    host.file(kFile, "eth0=12\n");
    Interfaces interfaces;
    interfaces.add("eth0", 1);
    FileAtTheAlert file{host};
    interfaces.mi().registerForAlerts(FileAtTheAlert::hear, &file);
    interfaces.mi().enableIndications();
    ASSERT_TRUE(eventually([&] { return host.read(kFile) == "eth0=1\n"; }));
    interfaces.mi().disableIndications();
    EXPECT_EQ(file.now(), "eth0=12\n");
}

HOST_TEST(NetworkMonitor, TellsAChangeAgainThatItCannotKeep) {
    host.file(kFile, "eth0=12\n");
    host.readOnly("/opt/vantrel/corvista/data");
    QX::setClockSpeed(1000);
    Interfaces interfaces;
    interfaces.add("eth0", 1);
    Heard heard;
    interfaces.mi().registerForAlerts(Heard::hear, &heard);
    interfaces.mi().enableIndications();
    EXPECT_TRUE(eventually([&] { return heard.now().size() >= 2; }));
    interfaces.mi().disableIndications();
    EXPECT_THAT(heard.now(), Each("NIC is Online "));
}

HOST_TEST(NetworkMonitor, WakesWhenItIsAskedToStop) {
    Interfaces interfaces;
    QX::Event ended(true);
    IC::NetworkMonitor monitor(&ended, IC::myoshwmi);
    LogCapture capture;
    ASSERT_TRUE(monitor.start(nullptr));
    ASSERT_TRUE(eventually([&] { return !capture.messages(6000).empty(); })) << "the first pass is over";
    EXPECT_FALSE(monitor.isDone());
    monitor.stop();
    EXPECT_TRUE(eventually([&] { return monitor.isDone(); })) << "without an abort";
    EXPECT_TRUE(ended.wait(5));
}

HOST_TEST(NetworkMonitor, StoppedBeforeItRunsDoesNoPass) {
    QX::Event ended(true);
    IC::NetworkMonitor monitor(&ended, IC::myoshwmi);
    EXPECT_FALSE(monitor.isDone());
    monitor.stop();
    LogCapture capture;
    EXPECT_EQ(monitor.run(nullptr), nullptr);
    EXPECT_TRUE(monitor.isDone());
    EXPECT_TRUE(ended.wait(0));
    EXPECT_THAT(capture.ownMessages(), TextsAre("NetworkMonitor: run entry", "NetworkMonitor: run exit"));
}

HOST_TEST(NetworkMonitor, RunsCleanBesideReadersAndWriters) {
    host.directory("/opt/vantrel/corvista/data");
    QX::setClockSpeed(30000);  // a pass every millisecond
    const Waits waits;
    Interfaces interfaces;
    std::vector<InterfaceNode*> nodes;
    for (int i = 0; i < 8; ++i) {
        nodes.push_back(&interfaces.add("eth" + std::to_string(i), 1));
    }
    interfaces.mi().enableIndications();
    std::atomic<bool> done{false};
    std::vector<std::thread> agents;
    for (unsigned int seed = 0; seed < 4; ++seed) {
        agents.emplace_back([&, seed] {
            for (unsigned int i = seed; !done; ++i) {
                nodes[i % nodes.size()]->is(i % 3 == 0 ? 12 : 1);
                IC::PropertyValue value;
                EXPECT_EQ(nodes[(i + 1) % nodes.size()]->getProperty(123, value).getStatus(), 0);
            }
        });
    }
    EXPECT_TRUE(waits.othersBegin(100));
    done = true;
    for (std::thread& agent : agents) {
        agent.join();
    }
    interfaces.mi().disableIndications();
}

}  // namespace
