// Drives: given this snapshot, these nodes, after these commands, with these lines in the log.
#include "mi/disk_snapshot.h"
#include "mi/node_types.h"
#include "oshwmi/os_hw_mi.h"
#include "storage/storage_nodes.h"
#include "tests/storage/storage_host.h"
#include "tests/support/texts_are.h"

namespace {

using testing::ElementsAre;
using testing::IsEmpty;
using Access = IC::OsHwMITestAccess;

const std::string kOneDrive = "Disk /dev/sda: 80.0 GB, 80026361856 bytes\n";
const std::string kListing = "cat /tmp/fdisk_tmp | grep ^Disk";

std::string pathCommand(const std::string& line) {
    return "echo \"" + line + "\" | cut -d \" \" -f2";
}

std::string sizeCommand(const std::string& line) {
    return "echo \"" + line + "\" | cut -d \" \" -f5";
}

void build(FakeHost& host, const std::string& snapshot, bool update = false) {
    host.file(IC::diskSnapshotPath, snapshot);
    IC::myoshwmi.createHardDriveNodes(update);
}

class Drives : public StorageHost {};

HOST_TEST_F(Drives, ADriveHasPathSizeInThousandsOfBytesAndHealth) {
    build(host, kOneDrive);
    EXPECT_THAT(drives(), ElementsAre(Seen{101, 1, "/dev/sda", 80026361}));
    const auto node = nodesOfType(IC::NodeType::hardDrive).at(0);
    EXPECT_EQ(node->getLinkedId(), kControllerId);
    EXPECT_THAT(node->getMIIds(), ElementsAre(7));
    EXPECT_EQ(node->getStatus(), 1U);
    EXPECT_EQ(node->getDescription(), "Hard Drive");
    std::map<unsigned int, IC::PropertyValue> stored;
    node->getProperties(stored);
    EXPECT_THAT(stored, ElementsAre(testing::Pair(37, IC::PropertyValue(IC::Number(80026361ULL), true)),
                                    testing::Pair(89, IC::PropertyValue("/dev/sda", true)),
                                    testing::Pair(123, IC::PropertyValue(IC::Number(1U), true))));
    EXPECT_TRUE(stored.at(37).known());
}

HOST_TEST_F(Drives, TheHostIsAskedOneCommandAtATimeUnderTheFileLock) {
    std::vector<bool> locked;
    shell_stub::beforeEach([&](const std::string&) { locked.push_back(fileLockIsHeld()); });
    build(host, listing("mbr_logical"));
    const std::string disk = "Disk /dev/sda: 80.0 GB, 80026361856 bytes";
    EXPECT_THAT(commands(), ElementsAre(kListing, pathCommand(disk), sizeCommand(disk),
                                        pathCommand("Disk identifier: 0x8f3d0cf1")));
    EXPECT_THAT(locked, ElementsAre(true, true, true, true));
    EXPECT_FALSE(fileLockIsHeld());
}

HOST_TEST_F(Drives, OutputIsReadAfterTheLockIsReleased) {
    host.tool("cut %any", ToolAnswer{.out = "/dev/sda:\n", .action = kUntilItMayGoOn});
    host.file(IC::diskSnapshotPath, kOneDrive);
    std::thread builder([] { IC::myoshwmi.createHardDriveNodes(false); });
    EXPECT_TRUE(fileLockIsFreeWhile(host, "cut"));
    builder.join();
}

HOST_TEST_F(Drives, TheFirstBuildLogsEveryStep) {
    LogCapture log;
    build(host, kOneDrive);
    EXPECT_THAT(withoutPropertyLines(log.messages()),
                TextsAre("createHardDriveNodes: entry", "HardDriveNode::HardDriveNode: entry",
                         "HardDriveNode::HardDriveNode: exit", "New Hard Drive Node created /dev/sda",
                         "Hard Drive Node::Normal /dev/sda", "createHardDriveNodes: exit"));
    for (const auto& [line, times] : {std::pair("HardDriveNode::setProperty: entry", 3),
                                      {"HardDriveNode::setProperty: exit", 3},
                                      {"HardDriveNode::getProperty: entry", 1},
                                      {"HardDriveNode::getProperty: exit", 1}}) {
        EXPECT_EQ(std::ranges::count(log.messages(), line), times) << line;
    }
    EXPECT_EQ(log.messages(3000), log.messages());
    EXPECT_EQ(log.lines().front().function, "createHardDriveNodes");
    EXPECT_TRUE(log.everyLineTwice());
}

HOST_TEST_F(Drives, AnUpdateWithdrawsTheOldNodesAndPublishesTheNewOnesOneByOne) {
    build(host, kOneDrive + "Disk /dev/sdb: 500.1 GB, 500107862016 bytes\n");
    EXPECT_THAT(diary(), IsEmpty()) << "the first nodes are in the map that the agent reads";
    LogCapture log;
    build(host, "Disk /dev/sdc: 1000.2 GB, 1000204886016 bytes\n", true);
    EXPECT_THAT(diary(), TextsAre("withdrawn /dev/sda", "withdrawn /dev/sdb", "published /dev/sdc"));
    EXPECT_THAT(drives(), ElementsAre(Seen{103, 1, "/dev/sdc", 1000204886}));
    const auto said = log.messages();
    EXPECT_THAT(said, testing::Contains("Delete a Hrad Drive entry: Hard Drive").Times(2));
    EXPECT_THAT(said, testing::Contains("HardDriveNode::~HardDriveNode: entry").Times(2));
    EXPECT_THAT(said, testing::Contains("HardDriveNode::~HardDriveNode: exit").Times(2));
    EXPECT_THAT(said, testing::IsSupersetOf({"Hard Drive Update created /dev/sdc",
                                             "Hard Drive Node::Normal /dev/sdc", "publishNode: entry",
                                             "publishNode: exit", "Updated Hard Drive Node Published"}));
    EXPECT_EQ(log.messages(3000), log.messages());
    EXPECT_THAT(Access::drawnIds(), ElementsAre(100, 101, 102, 103));
}

HOST_TEST_F(Drives, ANodeThatIsBeingReadOutlivesItsWithdrawal) {
    build(host, kOneDrive);
    auto held = nodesOfType(IC::NodeType::hardDrive).at(0);
    LogCapture log;
    build(host, "", true);
    EXPECT_THAT(log.messages(), testing::Not(testing::Contains("HardDriveNode::~HardDriveNode: entry")));
    IC::PropertyValue path;
    EXPECT_EQ(held->getProperty(89, path).getStatus(), 0);
    EXPECT_EQ(std::string(path), "/dev/sda");
    held.reset();
    EXPECT_THAT(log.messages(), testing::Contains("HardDriveNode::~HardDriveNode: exit"));
}

HOST_TEST_F(Drives, AnEmptySnapshotGivesNoneAndAnUpdateStillWithdraws) {
    build(host, "");
    EXPECT_THAT(drives(), IsEmpty());
    build(host, kOneDrive);
    build(host, "", true);
    EXPECT_THAT(drives(), IsEmpty());
    EXPECT_THAT(Access::drives(), IsEmpty());
    EXPECT_THAT(diary(), TextsAre("withdrawn /dev/sda"));
}

HOST_TEST_F(Drives, AMissingSnapshotGivesNone) {
    IC::myoshwmi.createHardDriveNodes(false);
    EXPECT_THAT(drives(), IsEmpty());
}

HOST_TEST_F(Drives, OnlyDisksProperAreKept) {
    build(host, listing("raid_and_mapper"));
    EXPECT_THAT(drives(),
                ElementsAre(Seen{101, 1, "/dev/sda", 500107862}, Seen{102, 2, "/dev/sdb", 500107862}));
    build(host, listing("other_buses"), true);
    EXPECT_THAT(drives(), IsEmpty());
    build(host, listing("ide"), true);
    EXPECT_THAT(drives(), ElementsAre(Seen{103, 1, "/dev/hda", 40020664}));
}

HOST_TEST_F(Drives, AnyNumberOfDrivesAndADiskWithoutATable) {
    build(host, listing("many_drives"));
    EXPECT_THAT(drives(),
                ElementsAre(Seen{101, 1, "/dev/sda", 500107862}, Seen{102, 2, "/dev/sdb", 500108910},
                            Seen{103, 3, "/dev/sdz", 500109959}, Seen{104, 4, "/dev/sdaa", 500111007},
                            Seen{105, 5, "/dev/sdab", 500112056}));
    build(host, listing("no_table"), true);
    EXPECT_THAT(drives(), ElementsAre(Seen{106, 1, "/dev/sdb", 2000398934}));
}

HOST_TEST_F(Drives, ADriveOfMoreThanTwoTebibytesKeepsItsSizeOnEveryHost) {
    build(host, listing("gpt_large"));
    EXPECT_THAT(drives(), ElementsAre(Seen{101, 1, "/dev/sda", 3000592982}));
    build(host, "Disk /dev/sda: 18 TB, 18000207937536 bytes\n", true);
    EXPECT_EQ(drives().at(0).size, 18000207937ULL);
}

HOST_TEST_F(Drives, ASizeThatIsNoNumberCountsAsNothing) {
    for (const std::string size : {"", "bytes", "-5000", "nan", "inf", "1e30"}) {
        build(host, "Disk /dev/sda: 80.0 GB, " + size + " bytes\n", true);
        EXPECT_EQ(drives().at(0).size, 0U) << size;
    }
    build(host, "Disk /dev/sda:\n", true);
    EXPECT_EQ(drives().at(0).size, 0U) << "a line that ends behind the device";
    build(host, "Disk /dev/sda: 80.0 GB, 80026361856bytes\n", true);
    EXPECT_EQ(drives().at(0).size, 80026361U) << "what follows the digits does not count";
}

HOST_TEST_F(Drives, EveryColonBehindTheDeviceGoes) {
    build(host, "Disk /dev/sda::: 80.0 GB, 999 bytes\nDisk /dev/sdb 80.0 GB, 1000 bytes\nDisk\nDiskless\n");
    EXPECT_THAT(drives(), ElementsAre(Seen{101, 1, "/dev/sda", 0}, Seen{102, 2, "/dev/sdb", 1}));
}

HOST_TEST_F(Drives, ALineGoesToTheShellAsItIs) {
    const std::string line = "Disk /dev/sda: 'x'  *? ; | & #\t\xff 42";
    shell_stub::answerWith([&](const std::string& command) -> std::optional<std::string> {
        if (command == pathCommand(line)) return "/dev/sda:\n";
        if (command == sizeCommand(line)) return "5000\n";
        return std::nullopt;
    });
    build(host, line + "\n");
    EXPECT_THAT(commands(), ElementsAre(kListing, pathCommand(line), sizeCommand(line)));
    EXPECT_THAT(drives(), ElementsAre(Seen{101, 1, "/dev/sda", 5}));
}

HOST_TEST_F(Drives, ALineThatTheShellWouldReadAnythingIntoIsSkipped) {
    const std::string line = "Disk /dev/sda`y`: 80.0 GB, 1000 bytes";
    LogCapture log;
    build(host, line + "\nDisk /dev/sdb: 80.0 GB, 1000 bytes\n");
    EXPECT_THAT(drives(), ElementsAre(Seen{101, 1, "/dev/sdb", 1}));
    EXPECT_THAT(log.messages(6000), TextsAre("Command refused for its text \"" + line +
                                                 "\" (the \"`\"), not run: " + pathCommand(line),
                                             "Command : " + pathCommand(line) + " failed!!"));
}

HOST_TEST_F(Drives, ALineTooLongForItsCommandIsSkipped) {
    const std::string start = "Disk /dev/sda: 80.0 GB, 80026361856 ";
    const std::string fits = start + std::string(511 - pathCommand(start).size(), 'x');
    const std::string tooLong = fits + "x";
    LogCapture log;
    build(host, tooLong + "\n" + fits + "\nDisk /dev/sdb: 80.0 GB, 1000 bytes\n");
    EXPECT_THAT(drives(), ElementsAre(Seen{101, 1, "/dev/sda", 80026361}, Seen{102, 2, "/dev/sdb", 1}));
    EXPECT_THAT(log.messages(6000), TextsAre("Command too long, not run: " + pathCommand(tooLong),
                                             "Command : " + pathCommand(tooLong) + " failed!!"));
    EXPECT_THAT(commands(), testing::Not(testing::Contains(pathCommand(tooLong))));
}

HOST_TEST_F(Drives, TheRestOfALineTooLongForTheBufferIsNoDrive) {
    const std::string start = "Disk /dev/sda: 80.0 GB, 80026361856 ";
    const std::string full = start + std::string(511 - start.size(), 'x');
    LogCapture log;
    build(host, full + " /dev/sdc: 80.0 GB, 1000 bytes\n" + full + "\nDisk /dev/sdb: 80.0 GB, 1000 bytes\n");
    EXPECT_THAT(drives(), ElementsAre(Seen{101, 1, "/dev/sdb", 1}));
    const std::string sdb = "Disk /dev/sdb: 80.0 GB, 1000 bytes";
    EXPECT_THAT(commands(), ElementsAre(kListing, pathCommand(sdb), sizeCommand(sdb)));
    const std::string refused = "Command too long, not run: " + pathCommand(full);
    const std::string failed = "Command : " + pathCommand(full) + " failed!!";
    EXPECT_THAT(log.messages(6000), ElementsAre(refused, failed, refused, failed));
}

HOST_TEST_F(Drives, ALineThatJustFitsTheBufferDoesNotSwallowTheNextOne) {
    const std::string start = "Disk /dev/sda: 80.0 GB, 80026361856 ";
    build(host, start + std::string(510 - start.size(), 'x') + "\nDisk /dev/sdb: 80.0 GB, 1000 bytes\n");
    EXPECT_THAT(drives(), ElementsAre(Seen{101, 1, "/dev/sdb", 1}));
}

/// sda to sdz, sdaa to sdzz, sdaaa and so on.
std::string deviceOfNumber(unsigned number) {
    std::string letters;
    for (unsigned left = number + 1; left != 0; left = (left - 1) / 26) {
        letters.insert(letters.begin(), static_cast<char>('a' + (left - 1) % 26));
    }
    return "/dev/sd" + letters;
}

// The listing is more than a pipe holds: it stands still while the questions about its lines are asked.
HOST_TEST_F(Drives, TwoThousandOfThem) {
    std::string snapshot;
    for (unsigned number = 0; number < 2000; ++number) {
        snapshot += "Disk " + deviceOfNumber(number) + ": 500.1 GB, 500107862016 bytes\n";
    }
    shell_stub::answerWith([](const std::string& command) -> std::optional<std::string> {
        if (!command.starts_with("echo \"Disk ")) return std::nullopt;
        if (command.ends_with("-f5")) return "500107862016\n";
        const std::string path = command.substr(sizeof "echo \"Disk " - 1);
        return path.substr(0, path.find(' ')) + "\n";
    });
    build(host, snapshot);
    const auto found = drives();
    ASSERT_EQ(found.size(), 2000U);
    EXPECT_EQ(found.front(), (Seen{101, 1, "/dev/sda", 500107862}));
    EXPECT_EQ(found.back(), (Seen{2100, 2000, "/dev/sdbxx", 500107862}));
}

HOST_TEST_F(Drives, AListingThatCannotStartLeavesNoNodes) {
    build(host, kOneDrive);
    shell_stub::failWhen([](const std::string& command) { return command == kListing; });
    LogCapture log;
    build(host, kOneDrive, true);
    EXPECT_THAT(log.messages(6000), TextsAre("fdisk command " + kListing + " failed!!"));
    EXPECT_EQ(log.messages().back(), "createHardDriveNodes: exit");
    EXPECT_THAT(drives(), IsEmpty());
    EXPECT_THAT(diary(), TextsAre("withdrawn /dev/sda"));
}

HOST_TEST_F(Drives, ALineWhoseCommandCannotStartIsSkipped) {
    const std::string a = "Disk /dev/sda: 80.0 GB, 1000 bytes";
    const std::string b = "Disk /dev/sdb: 80.0 GB, 2000 bytes";
    const std::string c = "Disk /dev/sdc: 80.0 GB, 3000 bytes";
    shell_stub::failWhen(
        [&](const std::string& command) { return command == pathCommand(a) || command == sizeCommand(b); });
    LogCapture log;
    build(host, a + "\n" + b + "\n" + c + "\n");
    EXPECT_THAT(drives(), ElementsAre(Seen{102, 1, "/dev/sdc", 3}));
    EXPECT_EQ(Access::drives().size(), 1U);
    EXPECT_THAT(log.messages(6000), TextsAre("Command : " + pathCommand(a) + " failed!!",
                                             "Command : " + sizeCommand(b) + " failed!!"));
}

HOST_TEST_F(Drives, ToolsThatAreMissingGiveNoDrives) {
    host.toolMissing("cut");
    LogCapture log;
    build(host, kOneDrive);
    EXPECT_THAT(drives(), IsEmpty());
    EXPECT_THAT(log.messages(6000), IsEmpty());
}

HOST_TEST_F(Drives, EachNodeThatTheAgentRefusesIsLoggedOnceAndTheNextOneIsBuilt) {
    agentRefuses();
    LogCapture log;
    build(host, kOneDrive + "Disk /dev/sdb: 80.0 GB, 80026361856 bytes\n", true);
    EXPECT_THAT(log.messages(6000),
                TextsAre("addNewNode error = the agent is full", "addNewNode error = the agent is full"));
    EXPECT_EQ(Access::drives().size(), 2U);
}

HOST_TEST_F(Drives, ANodeThatTheAgentRefusesIsLoggedAndGoesWithTheNextUpdate) {
    agentRefuses();
    LogCapture log;
    build(host, kOneDrive, true);
    EXPECT_THAT(log.messages(6000), TextsAre("addNewNode error = the agent is full"));
    EXPECT_THAT(drives(), IsEmpty());
    EXPECT_EQ(Access::drives().size(), 1U);
    build(host, "", true);
    EXPECT_THAT(log.messages(), testing::Contains("HardDriveNode::~HardDriveNode: exit"));
    EXPECT_THAT(Access::drives(), IsEmpty());
}

HOST_TEST_F(Drives, HealthIsAlwaysGoodAndWritesAreOnlyStored) {
    build(host, kOneDrive);
    const auto node = nodesOfType(IC::NodeType::hardDrive).at(0);
    clearCommands();
    EXPECT_EQ(node->setProperty(123, IC::PropertyValue(IC::Number(12U), true)).getStatus(), 0);
    EXPECT_EQ(node->setProperty(200, IC::PropertyValue("label", true)).getStatus(), 0);
    IC::PropertyValue value;
    EXPECT_EQ(node->getProperty(123, value).getStatus(), 0);
    EXPECT_EQ(value, IC::PropertyValue(IC::Number(1U), true));
    EXPECT_EQ(value.asNumber()->kind(), IC::Number::unsigned32);
    EXPECT_EQ(node->getProperty(200, value).getStatus(), 0);
    EXPECT_EQ(std::string(value), "label");
    EXPECT_EQ(node->getProperty(999, value).getStatus(), 1);
    EXPECT_THAT(commands(), IsEmpty());
}

HOST_TEST_F(Drives, TheSnapshotIsRemovedUnderTheFileLock) {
    host.file(IC::diskSnapshotPath, kOneDrive);
    bool locked = false;
    shell_stub::beforeEach([&](const std::string&) { locked = fileLockIsHeld(); });
    LogCapture log;
    IC::deleteFdiskTmp();
    EXPECT_FALSE(host.exists(IC::diskSnapshotPath));
    EXPECT_TRUE(locked);
    EXPECT_THAT(commands(), TextsAre("rm /tmp/fdisk_tmp 2> /dev/null"));
    EXPECT_THAT(log.messages(),
                TextsAre("deleteFdiskTmp: entry", "Deleting /tmp/fdisk_tmp", "deleteFdiskTmp: exit"));
}

HOST_TEST_F(Drives, ASnapshotThatCannotBeRemovedIsLogged) {
    host.file(IC::diskSnapshotPath, kOneDrive);
    shell_stub::failWhen([](const std::string&) { return true; });
    LogCapture log;
    IC::deleteFdiskTmp();
    EXPECT_TRUE(host.exists(IC::diskSnapshotPath));
    EXPECT_THAT(log.messages(6000), TextsAre("Could not delete /tmp/fdisk_tmp"));
    EXPECT_EQ(log.messages().back(), "deleteFdiskTmp: exit");
}

}  // namespace
