// Starts that run out of memory at every place where they ask for some.
#include <gmock/gmock.h>

#include <new>
#include <stdexcept>
#include <thread>

#include "framework/cvlog/logger.h"
#include "mi/globals.h"
#include "oshwmi/os_hw_mi.h"
#include "tests/support/failing_new.h"
#include "tests/support/fake_host.h"
#include "tests/support/log_capture.h"
#include "tests/support/plugin_access.h"
#include "tests/support/shell_stub.h"
#include "tests/support/waiting.h"

namespace {

/// Waits until so many threads run.
bool comeTo(std::size_t wanted) {
    return eventually([wanted] { return runningThreads() == wanted; });
}

using IC::Number;
using testing::Contains;

/// A team, and nothing else that a command tells of; no process is started.
std::string answer(const std::string& command) {
    return command.starts_with("cat /proc/net/bonding/bond0 ") ? " eth0\n" : "";
}

HOST_TEST(NoMemory, AnyAllocationOfAStartMayFail) {
    host.file("/proc/net/bonding/bond0", "");
    shell_stub::answerWith(answer);
    CVLog::CVLogger::setLog(nullptr, 0);
    QX::setClockSpeed(50);  // for the millisecond that each stop grants a thread
    long allocations = 0;
    for (bool failed = true; failed; ++allocations) {
        {
            const FailingOnce once(allocations);
            EXPECT_NO_THROW(IC::myoshwmi.initialize(1, Number(1U), Number(2U))) << allocations;
            failed = once.happened();
        }
        EXPECT_TRUE(IC::OSHWMI::bInitflag) << "it went to its end";
        EXPECT_TRUE(failed || IC::myoshwmi.holdAll().size() == 8) << "the whole tree and the team";
        IC::myoshwmi.unload();
        ASSERT_TRUE(IC::myoshwmi.holdAll().empty());
    }
    EXPECT_GT(allocations, 100);
    shell_stub::answerWith({});
}

HOST_TEST(NoMemory, OfAStartWhoseBaseFailsThrowsNothingEither) {
    shell_stub::answerWith(answer);
    CVLog::CVLogger::setLog(nullptr, 0);
    QX::setClockSpeed(50);  // for the millisecond that each stop grants a thread
    long allocations = 0;
    for (bool failed = true; failed; ++allocations) {
        {
            const FailingOnce once(allocations);
            EXPECT_NO_THROW({
                const IC::Error result = IC::myoshwmi.initialize(1, Number(), Number());
                EXPECT_NE(result.getStatus(), 0) << allocations;
            }) << allocations;
            failed = once.happened();
        }
        EXPECT_TRUE(IC::OSHWMI::bInitflag) << allocations;
        IC::myoshwmi.unload();
    }
    EXPECT_GT(allocations, 100);
    shell_stub::answerWith({});
}

HOST_TEST(NoMemory, AnyAllocationOfAStopMayFail) {
    host.file("/proc/net/bonding/bond0", "");
    host.file("/opt/vantrel/corvista/data/ifcfg-eth0", "");
    shell_stub::answerWith(answer);
    CVLog::CVLogger::setLog(nullptr, 0);
    QX::setClockSpeed(50);
    std::thread([] {}).join();  // what a sanitizer starts beside the first thread of a process
    const auto before = runningThreads();
    long allocations = 0;
    for (bool failed = true; failed; ++allocations) {
        IC::myoshwmi.initialize(1, Number(1U), Number(2U));
        ASSERT_TRUE(comeTo(before + 2)) << "the two monitors";
        {
            const FailingOnce once(allocations);
            EXPECT_NO_THROW(IC::myoshwmi.unload()) << allocations;
            failed = once.happened();
        }
        ASSERT_TRUE(comeTo(before)) << allocations;
        EXPECT_TRUE(IC::myoshwmi.holdAll().empty());
        EXPECT_FALSE(IC::OsHwMITestAccess::hasInventory());
    }
    EXPECT_GT(allocations, 10);
    shell_stub::answerWith({});
}

HOST_TEST(NoMemory, ForTheTreeLeavesTheRestOfTheStartToRun) {
    shell_stub::answerWith(answer);
    LogCapture capture;
    {
        const FailingNew none(sizeof(IC::MutableNode), [] { throw std::bad_alloc(); });
        IC::myoshwmi.initialize(1, Number(1U), Number(2U));
    }
    EXPECT_TRUE(IC::OSHWMI::bInitflag);
    EXPECT_EQ(capture.ownMessages(6000).size(), 7U) << "one for each node of the tree";
    EXPECT_THAT(capture.ownMessages(6000), Contains("createDiskControllerNodes failed: std::bad_alloc"));
    EXPECT_THAT(capture.ownMessages(), Contains("NetworkMonitor thread created."));
    EXPECT_THAT(capture.ownMessages(), Contains("HardDriveUpdateThread thread created."));
    IC::myoshwmi.unload();
    shell_stub::answerWith({});
}

HOST_TEST(NoMemory, LeavesNothingForAnOrphanToHangUnder) {
    EXPECT_THROW(IC::myoshwmi.createRootNode(), std::logic_error);
}

}  // namespace
