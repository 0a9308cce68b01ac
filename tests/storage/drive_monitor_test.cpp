// The thread that watches the layout: when it compares, and how it ends.
#include "storage/drive_monitor.h"
#include "oshwmi/os_hw_mi.h"

#include <pthread.h>

#include <algorithm>
#include <atomic>
#include <new>
#include <numeric>
#include <thread>

#include "mi/disk_snapshot.h"
#include "mi/globals.h"
#include "tests/storage/storage_host.h"
#include "tests/support/failing_new.h"
#include "tests/support/texts_are.h"
#include "tests/support/waiting.h"
#include "tests/support/waits.h"

namespace {

using testing::Contains;
using testing::IsEmpty;
using testing::Not;
using Access = IC::OsHwMITestAccess;

const std::string kLayout = "Disk /dev/sda: 80.0 GB, 80026361856 bytes\n/dev/sda1 1 2 300 83 Linux\n";

/// Passes so far, as the snapshot commands tell, with the seconds that the monitor had waited for before
/// each.
class Passes {
public:
    explicit Passes(const Waits& waits) {
        shell_stub::beforeEach([&](const std::string& command) {
            if (command == IC::diskSnapshotCommand) {
                const auto waited = waits.others();
                const std::lock_guard lock(guard_);
                after_.push_back(std::accumulate(waited.begin(), waited.end(), 0.0));
            }
        });
    }
    Passes(const Passes&) = delete;
    Passes& operator=(const Passes&) = delete;
    ~Passes() { shell_stub::beforeEach({}); }

    std::vector<double> after() const {
        const std::lock_guard lock(guard_);
        return after_;
    }
    std::size_t count() const { return after().size(); }
    bool waitFor(std::size_t count) const {
        return eventually([&] { return this->count() >= count; });
    }

private:
    mutable std::mutex guard_;
    std::vector<double> after_;
};

class DriveMonitor : public StorageHost {
protected:
    void setUpHost(FakeHost& host) override {
        StorageHost::setUpHost(host);
        host.tool("fdisk -ls", kLayout);
        host.file(IC::diskSnapshotPath, kLayout);
        IC::myoshwmi.createHardDriveNodes(false);
        IC::myoshwmi.createPartitionNodes(false);
        clearCommands();
    }

    /// A stop while a tool of a comparison hangs.
    static std::vector<std::string> stopWhileHanging(const FakeHost& host, const std::string& tool) {
        const Waits waits;
        QX::setClockSpeed(1000);
        IC::myoshwmi.startHDDThread();
        EXPECT_TRUE(eventually([&] { return !host.callsOf(tool).empty(); }));
        LogCapture log;
        Access::stopMonitor();
        EXPECT_EQ(waits.ours().back(), 10) << "seconds of patience";
        EXPECT_THAT(diary(), IsEmpty()) << "nothing was compared";
        EXPECT_THAT(log.messages(6000), IsEmpty());
        return log.ownMessages();
    }
};

HOST_TEST_F(DriveMonitor, ComparesAfterTwoMinutesAndThenEveryMinute) {
    QX::setClockSpeed(10'000);
    const Waits waits;
    const Passes passes(waits);
    IC::myoshwmi.startHDDThread();
    EXPECT_TRUE(Access::monitorRuns());
    ASSERT_TRUE(passes.waitFor(3));
    Access::stopMonitor();
    const auto after = passes.after();
    EXPECT_THAT(std::vector(after.begin(), after.begin() + 3), testing::ElementsAre(120, 180, 240));
    EXPECT_THAT(diary(), TextsAre("withdrawn /dev/sda", "published /dev/sda", "withdrawn /dev/sda1",
                                  "published /dev/sda1"))
        << "once by the first pass, never again";
}

HOST_TEST_F(DriveMonitor, StartedAgainPublishesEverythingOnceAgain) {
    QX::setClockSpeed(10'000);
    for (int start = 0; start < 2; ++start) {
        diary().clear();
        IC::HardDriveNodeUpdate = false;
        const Waits waits;
        const Passes passes(waits);
        IC::myoshwmi.startHDDThread();
        ASSERT_TRUE(passes.waitFor(3));
        Access::stopMonitor();
        EXPECT_THAT(diary(), TextsAre("withdrawn /dev/sda", "published /dev/sda", "withdrawn /dev/sda1",
                                      "published /dev/sda1"));
    }
}

HOST_TEST_F(DriveMonitor, StartedWhileOneRunsTheEarlierOneEndsFirst) {
    QX::setClockSpeed(10'000);
    host.tool("fdisk -ls", ToolAnswer{.out = kLayout, .action = kUntilItMayGoOn});
    const LogCapture log;
    Waits waits;
    waits.whenWeWait([&](double) {  // for the earlier one, which is in the middle of a comparison
        host.file("/go-on", "");
        EXPECT_TRUE(eventually([&] {
            const auto said = log.messages();
            return std::ranges::find(said, "Hard Drive ThreadProcess :: Exit") != said.end();
        }));
    });
    const Passes passes(waits);
    IC::myoshwmi.startHDDThread();
    ASSERT_TRUE(eventually([&] { return !host.callsOf("fdisk").empty(); }));
    IC::myoshwmi.startHDDThread();
    ASSERT_TRUE(passes.waitFor(3));
    Access::stopMonitor();
    const auto once = {"withdrawn /dev/sda", "published /dev/sda", "withdrawn /dev/sda1",
                       "published /dev/sda1"};
    std::vector<std::string> twice(once.begin(), once.end());
    twice.insert(twice.end(), once.begin(), once.end());
    EXPECT_EQ(diary(), twice) << "by the first pass of either";
}

HOST_TEST_F(DriveMonitor, FollowsTheLayout) {
    QX::setClockSpeed(10'000);
    host.toolInTurn("fdisk -ls",
                    {{.out = kLayout}, {.out = kLayout}, {.out = kLayout + "/dev/sda2 3 4 500 83 Linux\n"}});
    const Waits waits;
    const Passes passes(waits);
    IC::myoshwmi.startHDDThread();
    ASSERT_TRUE(passes.waitFor(4));
    Access::stopMonitor();
    EXPECT_EQ(partitions().size(), 2U);
    EXPECT_EQ(drives().size(), 1U);
    EXPECT_THAT(diary(), TextsAre("withdrawn /dev/sda", "published /dev/sda", "withdrawn /dev/sda1",
                                  "published /dev/sda1", "withdrawn /dev/sda1", "published /dev/sda1",
                                  "published /dev/sda2"));
}

/// The messages of this thread, or of all others.
std::vector<std::string> messages(const LogCapture& log, bool ours) {
    std::vector<std::string> found;
    for (const LogLine& line : log.lines()) {
        if (line.channel == LogLine::Channel::log && (line.thread == std::this_thread::get_id()) == ours) {
            found.push_back(line.message);
        }
    }
    return found;
}

HOST_TEST_F(DriveMonitor, UnloadDuringTheFirstWaitEndsItAtOnceWithoutAComparison) {
    QX::setClockSpeed(0.02);  // whoever waits for the monitor's sleep waits for ever
    LogCapture log;
    const Waits waits;
    IC::myoshwmi.startHDDThread();
    ASSERT_TRUE(waits.othersBegin(1));
    Access::stopMonitor();
    EXPECT_THAT(waits.others(), testing::ElementsAre(5)) << "seconds: one slice, and none after it";
    EXPECT_THAT(commands(), IsEmpty());
    EXPECT_TRUE(Access::monitorEndedWithin(0)) << "the completion event is signalled";
    EXPECT_FALSE(Access::monitorRuns());
    EXPECT_THAT(messages(log, true),
                TextsAre("startHDDThread: entry", "HardDriveUpdateMonitor::const: entry",
                         "HardDriveUpdateMonitor::Const: exit", "HardDriveUpdateThread thread created.",
                         "startHDDThread: exit", "HardDriveUpdateMonitor::stop: entry",
                         "HardDriveUpdateMonitor::stop: exit",
                         "disable Hard Drive updates: waiting for HardDriveUpdateMonitor Termination ",
                         "disable Hard Drive updates: HardDriveUpdateMonitor terminated.",
                         "HardDriveUpdateMonitor::~HardDriveUpdateMonitor: entry",
                         "HardDriveUpdateMonitor::~HardDriveUpdateMonitor: exit"));
    EXPECT_THAT(messages(log, false),
                TextsAre("HardDriveUpdateMonitor::run: entry", "HardDriveUpdateMonitor::run: exit"));
}

HOST_TEST_F(DriveMonitor, AStopIsSeenWithinOneSlice) {
    QX::setClockSpeed(1000);
    Waits waits;
    waits.holdFrom(3);
    QX::Event ended(true);
    IC::HardDriveUpdateMonitor monitor(&ended, IC::myoshwmi);
    ASSERT_TRUE(monitor.start(nullptr));
    ASSERT_TRUE(waits.othersBegin(3));
    EXPECT_FALSE(monitor.isDone());
    monitor.stop();
    waits.letGo();
    EXPECT_TRUE(eventually([&] { return monitor.isDone(); }));
    EXPECT_EQ(waits.others().size(), 3U) << "of the twelve slices of a wait";
    EXPECT_TRUE(ended.wait(10));
    EXPECT_THAT(commands(), IsEmpty());
}

HOST_TEST_F(DriveMonitor, UnloadsFlagAloneEndsIt) {
    QX::setClockSpeed(100);
    QX::Event ended(true);
    IC::HardDriveUpdateMonitor monitor(&ended, IC::myoshwmi);
    ASSERT_TRUE(monitor.start(nullptr));
    IC::HardDriveNodeUpdate = true;
    EXPECT_TRUE(ended.wait(100));
    monitor.join();
    EXPECT_TRUE(monitor.isDone());
    EXPECT_THAT(commands(), IsEmpty());
}

HOST_TEST_F(DriveMonitor, AStopDuringTheSecondWaitLetsOneComparisonRun) {
    QX::setClockSpeed(1000);
    Waits waits;
    waits.holdFrom(13);                                // a wait has twelve slices
    waits.whenWeWait([&](double) { waits.letGo(); });  // when the stop has been asked for
    const Passes passes(waits);
    IC::myoshwmi.startHDDThread();
    ASSERT_TRUE(waits.othersBegin(13));
    Access::stopMonitor();
    EXPECT_EQ(passes.count(), 1U);
    EXPECT_EQ(waits.others().size(), 13U);
}

HOST_TEST_F(DriveMonitor, AStopDuringAComparisonWaitsForItsEnd) {
    host.tool("fdisk -ls", ToolAnswer{.out = kLayout, .action = kUntilItMayGoOn});
    QX::setClockSpeed(1000);
    Waits waits;
    waits.whenWeWait([&](double) { host.file("/go-on", ""); });
    const Passes passes(waits);
    IC::myoshwmi.startHDDThread();
    ASSERT_TRUE(eventually([&] { return !host.callsOf("fdisk").empty(); }));
    QX::setClockSpeed(1);
    Access::stopMonitor();
    EXPECT_EQ(passes.count(), 1U);
    EXPECT_EQ(diary().size(), 4U) << "the comparison went to its end";
}

HOST_TEST_F(DriveMonitor, AStopWhileFdiskHangsEndsItAfterTenSeconds) {
    host.tool("fdisk -ls", ToolAnswer{.out = kLayout, .delayMilliseconds = 60'000});
    EXPECT_THAT(stopWhileHanging(host, "fdisk"),
                TextsAre("HardDriveUpdateMonitor::stop: entry", "HardDriveUpdateMonitor::stop: exit",
                         "disable Hard Drive updates: waiting for HardDriveUpdateMonitor Termination ",
                         "disable Hard Drive updates: HardDriveUpdateMonitor terminated.",
                         "HardDriveUpdateMonitor::~HardDriveUpdateMonitor: entry",
                         "HardDriveUpdateMonitor::~HardDriveUpdateMonitor: exit"));
}

HOST_TEST_F(DriveMonitor, AStopWhileADigestHangsWithdrawsNothing) {
    host.tool("md5sum", ToolAnswer{.out = "0  -\n", .delayMilliseconds = 60'000});
    stopWhileHanging(host, "md5sum");
}

/// An agent that stops the plug-in while it is handed a drive.
HOST_TEST_F(DriveMonitor, MayBeStoppedByTheCallbackThatItCalls) {
    host.tool("fdisk -ls", "Disk /dev/sdb: 80.0 GB, 80026361856 bytes\n" + kLayout);
    QX::setClockSpeed(1000);
    static std::atomic<int> calls{0};
    IC::myoshwmi.setLoadCallBack(
        [](IC::Node* const&, const void*) -> IC::Error {
            EXPECT_EQ(IC::myoshwmi.unload().getStatus(), 0);
            ++calls;
            return {};
        },
        nullptr, nullptr);
    LogCapture log;
    IC::myoshwmi.startHDDThread();
    const auto ended = [&] {
        const auto said = log.messages();
        return std::ranges::find(said, "HardDriveUpdateMonitor::~HardDriveUpdateMonitor: exit") != said.end();
    };
    EXPECT_TRUE(eventually(ended));
    EXPECT_EQ(calls, 1);
    EXPECT_TRUE(Access::drives().empty());
    EXPECT_THAT(log.messages(6000), IsEmpty());
}

HOST_TEST_F(DriveMonitor, AMonitorThatIsDroppedEndsByItself) {
    QX::Event ended(true);
    {
        const Waits waits;
        IC::HardDriveUpdateMonitor monitor(&ended, IC::myoshwmi);
        ASSERT_TRUE(monitor.start(nullptr));
        ASSERT_TRUE(waits.othersBegin(1));
    }
    EXPECT_TRUE(ended.wait(0));
}

HOST_TEST_F(DriveMonitor, AThreadThatCannotStartIsLogged) {
    pthread_attr_t attributes;
    pthread_attr_init(&attributes);
    const std::size_t page = 4096;
    ASSERT_EQ(pthread_attr_setstacksize(&attributes, (~std::size_t{0} / 16 * 15) / page * page), 0);
    ASSERT_EQ(pthread_setattr_default_np(&attributes), 0) << "no memory holds such a stack";
    LogCapture log;
    IC::myoshwmi.startHDDThread();
    EXPECT_FALSE(Access::monitorRuns());
    EXPECT_THAT(log.messages(6000), TextsAre("HardDriveUpdateThread thread failed."));
    EXPECT_EQ(log.messages().back(), "startHDDThread: exit");
    log.clear();
    Access::stopMonitor();
    EXPECT_THAT(log.messages(), IsEmpty()) << "there is nothing to stop";
}

void startWithoutMemory() {
    const FailingNew none(sizeof(IC::HardDriveUpdateMonitor), [] { throw std::bad_alloc(); });
    IC::myoshwmi.startHDDThread();
}

HOST_TEST_F(DriveMonitor, AMonitorThatCannotBeMadeIsLogged) {
    LogCapture log;
    startWithoutMemory();
    EXPECT_FALSE(Access::monitorRuns());
    EXPECT_THAT(log.messages(6000), TextsAre("HardDriveUpdateThread Caught unknown exception"));
    EXPECT_EQ(log.messages().back(), "startHDDThread: exit");
}

HOST_TEST_F(DriveMonitor, WhereTheNextOneCannotBeMadeThereIsNothingToStop) {
    IC::myoshwmi.startHDDThread();
    startWithoutMemory();
    EXPECT_FALSE(Access::monitorRuns());
    Access::stopMonitor();
}

HOST_TEST_F(DriveMonitor, AComparisonThatThrowsIsLoggedAndTheNextOneRuns) {
    QX::setClockSpeed(10'000);
    std::atomic<int> snapshots{0};
    shell_stub::failWhen([&](const std::string& command) {
        if (command == IC::diskSnapshotCommand && ++snapshots == 1) {
            throw std::runtime_error("out of everything");
        }
        if (command == IC::diskSnapshotCommand && snapshots == 2) {
            throw 2;
        }
        return false;
    });
    LogCapture log;
    IC::myoshwmi.startHDDThread();
    EXPECT_TRUE(eventually([&] { return snapshots >= 4; }));
    Access::stopMonitor();
    EXPECT_THAT(log.messages(6000), TextsAre("HDDThreadProcess failed: out of everything",
                                             "HDDThreadProcess failed: unknown exception"));
    EXPECT_FALSE(diary().empty());
}

}  // namespace
