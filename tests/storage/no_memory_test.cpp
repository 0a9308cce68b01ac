// Rebuilds that run out of memory at every place where they ask for some: nothing is lost, nothing is left.
#include <new>
#include <stdexcept>

#include "mi/disk_snapshot.h"
#include "mi/node_types.h"
#include "oshwmi/os_hw_mi.h"
#include "tests/storage/storage_host.h"
#include "tests/support/failing_new.h"

namespace {

using testing::ElementsAre;
using Access = IC::OsHwMITestAccess;

/// Two drives and a partition, without a process.
std::optional<std::string> answer(const std::string& command) {
    if (command.find("grep ^Disk") != std::string::npos) {
        return "Disk a: x x 2000\nDisk b: x x 3000\n";
    }
    if (command.find("grep ^/dev") != std::string::npos) {
        return "/dev/sda1 1 2 5 83 Linux\n";
    }
    if (command.ends_with("-f2")) {
        return command.find("Disk a") != std::string::npos ? "/dev/sda:\n" : "/dev/sdb:\n";
    }
    return command.ends_with("-f5") ? "2000\n" : "5\n";
}

class NoMemory : public StorageHost {};

HOST_TEST_F(NoMemory, AnyAllocationOfARebuildMayFail) {
    forgetCommands();
    host.file(IC::diskSnapshotPath, "");
    shell_stub::answerWith(answer);
    const auto rebuild = [] {
        IC::myoshwmi.createHardDriveNodes(true);
        IC::myoshwmi.createPartitionNodes(true);
    };
    rebuild();
    long allocations = 0;
    for (bool failed = true; failed; ++allocations) {
        for (const auto& drive : nodesOfType(IC::NodeType::hardDrive)) {
            drive->setDescription("a name that the agent's user gave to this drive");
        }
        {
            const FailingOnce once(allocations);
            try {
                rebuild();
            } catch (const std::bad_alloc&) {
                // Once a minute the drive monitor tries again.
            }
            failed = once.happened();
        }
        rebuild();
        ASSERT_THAT(drives(), ElementsAre(testing::Field(&Seen::path, "/dev/sda"),
                                          testing::Field(&Seen::path, "/dev/sdb")))
            << "allocation " << allocations;
        ASSERT_THAT(partitions(), ElementsAre(testing::Field(&Seen::path, "/dev/sda1")));
        ASSERT_EQ(Access::drives().size(), 2U);
        ASSERT_EQ(Access::partitions().size(), 1U);
        diary().clear();
    }
    EXPECT_GT(allocations, 50);
    shell_stub::answerWith({});
}

/// Too long to be kept without memory.
const std::string kReason(300, 'x');

HOST_TEST_F(NoMemory, LeavesNoNodeBehindWhoseRefusalCannotBeTold) {
    host.file(IC::diskSnapshotPath, "");
    shell_stub::answerWith(answer);
    IC::myoshwmi.setLoadCallBack(
        [](IC::Node* const&, const void*) -> IC::Error { throw std::runtime_error(kReason); }, nullptr,
        nullptr);
    {
        const FailingNew none(kReason.size() + 1, [] { throw std::bad_alloc(); });
        EXPECT_THROW(IC::myoshwmi.createHardDriveNodes(true), std::bad_alloc);
    }
    EXPECT_TRUE(Access::drives().empty());
    EXPECT_TRUE(nodesOfType(IC::NodeType::hardDrive).empty()) << "nothing would ever withdraw it";
    shell_stub::answerWith({});
}

}  // namespace
