// The thread that watches the layout: when it compares, and how it ends.
#include "storage/drive_monitor.h"
#include "oshwmi/os_hw_mi.h"

#include <pthread.h>

#include <algorithm>
#include <atomic>
#include <chrono>
#include <new>
#include <thread>

#include "mi/disk_snapshot.h"
#include "mi/globals.h"
#include "tests/storage/storage_host.h"
#include "tests/support/failing_new.h"
#include "tests/support/texts_are.h"

namespace {

using namespace std::chrono_literals;
using std::chrono::steady_clock;
using testing::Contains;
using testing::IsEmpty;
using testing::Not;
using Access = IC::OsHwMITestAccess;

const std::string kLayout = "Disk /dev/sda: 80.0 GB, 80026361856 bytes\n/dev/sda1 1 2 300 83 Linux\n";

/// Passes so far, with the time of each, as the snapshot commands tell.
class Passes {
public:
    Passes() {
        shell_stub::beforeEach([this](const std::string& command) {
            if (command == IC::diskSnapshotCommand) {
                const std::lock_guard lock(guard_);
                times_.push_back(steady_clock::now());
            }
        });
    }
    Passes(const Passes&) = delete;
    Passes& operator=(const Passes&) = delete;
    ~Passes() { shell_stub::beforeEach({}); }

    std::vector<steady_clock::time_point> times() const {
        const std::lock_guard lock(guard_);
        return times_;
    }
    bool waitFor(std::size_t count) const {
        const auto end = steady_clock::now() + 20s;
        while (times().size() < count && steady_clock::now() < end) {
            std::this_thread::sleep_for(1ms);
        }
        return times().size() >= count;
    }

private:
    mutable std::mutex guard_;
    std::vector<steady_clock::time_point> times_;
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
        QX::setClockSpeed(1000);
        IC::myoshwmi.startHDDThread();
        const auto end = steady_clock::now() + 20s;
        while (host.callsOf(tool).empty() && steady_clock::now() < end) {
            std::this_thread::sleep_for(1ms);
        }
        EXPECT_FALSE(host.callsOf(tool).empty());
        QX::setClockSpeed(50);  // ten seconds pass in 200 ms
        LogCapture log;
        const auto start = steady_clock::now();
        Access::stopMonitor();
        EXPECT_GE(steady_clock::now() - start, 199ms) << "not before ten seconds";
        EXPECT_LT(steady_clock::now() - start, 10s);
        EXPECT_THAT(diary(), IsEmpty()) << "nothing was compared";
        EXPECT_THAT(log.messages(6000), IsEmpty());
        return log.ownMessages();
    }
};

HOST_TEST_F(DriveMonitor, ComparesAfterTwoMinutesAndThenEveryMinute) {
    QX::setClockSpeed(60);
    const Passes passes;
    const auto start = steady_clock::now();
    IC::myoshwmi.startHDDThread();
    EXPECT_TRUE(Access::monitorRuns());
    ASSERT_TRUE(passes.waitFor(2));
    Access::stopMonitor();
    const auto times = passes.times();
    EXPECT_GE(times[0] - start, 2s) << "a minute is a second here";
    EXPECT_LT(times[0] - start, 3s);
    EXPECT_GE(times[1] - times[0], 1s);
    EXPECT_THAT(diary(), TextsAre("withdrawn /dev/sda", "published /dev/sda", "withdrawn /dev/sda1",
                                  "published /dev/sda1"))
        << "once by the first pass, never again";
}

HOST_TEST_F(DriveMonitor, StartedAgainPublishesEverythingOnceAgain) {
    QX::setClockSpeed(1000);
    for (int start = 0; start < 2; ++start) {
        diary().clear();
        IC::HardDriveNodeUpdate = false;
        const Passes passes;
        IC::myoshwmi.startHDDThread();
        ASSERT_TRUE(passes.waitFor(3));
        Access::stopMonitor();
        EXPECT_THAT(diary(), TextsAre("withdrawn /dev/sda", "published /dev/sda", "withdrawn /dev/sda1",
                                      "published /dev/sda1"));
    }
}

HOST_TEST_F(DriveMonitor, StartedWhileOneRunsTheEarlierOneEndsFirst) {
    QX::setClockSpeed(1000);
    host.tool("fdisk -ls", ToolAnswer{.out = kLayout, .delayMilliseconds = 300});
    const Passes passes;
    IC::myoshwmi.startHDDThread();
    ASSERT_TRUE(passes.waitFor(1));
    EXPECT_EQ(passes.times().size(), 1U);
    IC::myoshwmi.startHDDThread();  // ten seconds pass in 10 ms: the fdisk of the earlier one is ended
    ASSERT_TRUE(passes.waitFor(3));
    QX::setClockSpeed(1);
    Access::stopMonitor();
    EXPECT_THAT(diary(), TextsAre("withdrawn /dev/sda", "published /dev/sda", "withdrawn /dev/sda1",
                                  "published /dev/sda1"))
        << "by the later one's first pass";
}

HOST_TEST_F(DriveMonitor, FollowsTheLayout) {
    QX::setClockSpeed(1000);
    host.toolInTurn("fdisk -ls",
                    {{.out = kLayout}, {.out = kLayout}, {.out = kLayout + "/dev/sda2 3 4 500 83 Linux\n"}});
    const Passes passes;
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
    LogCapture log;
    IC::myoshwmi.startHDDThread();
    std::this_thread::sleep_for(50ms);
    const auto start = steady_clock::now();
    Access::stopMonitor();
    EXPECT_LT(steady_clock::now() - start, 3s) << "the sleep of five seconds is not waited for";
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
    QX::setClockSpeed(10);
    QX::Event ended(true);
    IC::HardDriveUpdateMonitor monitor(&ended, IC::myoshwmi);
    ASSERT_TRUE(monitor.start(nullptr));
    std::this_thread::sleep_for(700ms);
    EXPECT_FALSE(monitor.isDone());
    const auto start = steady_clock::now();
    monitor.stop();
    while (!monitor.isDone() && steady_clock::now() - start < 10s) {
        std::this_thread::sleep_for(1ms);
    }
    EXPECT_TRUE(monitor.isDone());
    EXPECT_LT(steady_clock::now() - start, 3s) << "a slice is half a second here, a wait twelve of them";
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
    QX::setClockSpeed(50);
    const Passes passes;
    IC::myoshwmi.startHDDThread();
    std::this_thread::sleep_for(1800ms);  // the first wait takes 1.2 s here, and so does the second
    Access::stopMonitor();
    EXPECT_EQ(passes.times().size(), 1U);
}

HOST_TEST_F(DriveMonitor, AStopDuringAComparisonWaitsForItsEnd) {
    QX::setClockSpeed(1000);
    host.tool("fdisk -ls", ToolAnswer{.out = kLayout, .delayMilliseconds = 300});
    const Passes passes;
    IC::myoshwmi.startHDDThread();
    ASSERT_TRUE(passes.waitFor(1));
    QX::setClockSpeed(1);
    Access::stopMonitor();
    EXPECT_EQ(passes.times().size(), 1U);
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
    const auto end = steady_clock::now() + 20s;
    const auto ended = [&] {
        const auto said = log.messages();
        return std::ranges::find(said, "HardDriveUpdateMonitor::~HardDriveUpdateMonitor: exit") != said.end();
    };
    while (!ended() && steady_clock::now() < end) {
        std::this_thread::sleep_for(1ms);
    }
    EXPECT_TRUE(ended());
    EXPECT_EQ(calls, 1);
    EXPECT_TRUE(Access::drives().empty());
    EXPECT_THAT(log.messages(6000), IsEmpty());
}

HOST_TEST_F(DriveMonitor, AMonitorThatIsDroppedEndsByItself) {
    QX::Event ended(true);
    {
        IC::HardDriveUpdateMonitor monitor(&ended, IC::myoshwmi);
        ASSERT_TRUE(monitor.start(nullptr));
        std::this_thread::sleep_for(20ms);
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
    QX::setClockSpeed(1000);
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
    const auto end = steady_clock::now() + 20s;
    while (snapshots < 4 && steady_clock::now() < end) {
        std::this_thread::sleep_for(1ms);
    }
    Access::stopMonitor();
    EXPECT_GE(snapshots, 4);
    EXPECT_THAT(log.messages(6000), TextsAre("HDDThreadProcess failed: out of everything",
                                             "HDDThreadProcess failed: unknown exception"));
    EXPECT_FALSE(diary().empty());
}

}  // namespace
