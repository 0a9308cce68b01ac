#include "computer/owner_data.h"

#include <gmock/gmock.h>

#include <cstdlib>

#include "tests/computer/computer_host.h"
#include "tests/computer/computer_tools.h"
#include "tests/support/fake_host.h"
#include "tests/support/log_capture.h"
#include "tests/support/texts_are.h"

namespace {

using testing::IsEmpty;

struct Field {
    unsigned int id;
    std::string key;
};
const Field kFields[] = {{115, "Computer.OwnerContact"}, {116, "Computer.OwnerName"}};

HOST_TEST(Owner, IsReadFromTheAssetFile) {
    host.file(kAssetFile, "Computer.OwnerContact=+49 30 1234\nComputer.OwnerName=J\xc3\xbcrgen\n");
    const RunningComputer computer;
    EXPECT_EQ(computer.text(115), "+49 30 1234");
    EXPECT_EQ(computer.text(116), "J\xc3\xbcrgen");
    EXPECT_EQ(computer.read(115).kind(), IC::PropertyValue::text);
    EXPECT_TRUE(computer.read(115).known());
    EXPECT_THAT(host.calls(), IsEmpty());
}

HOST_TEST(Owner, LiesInTheAgentsDataDirectory) {
    setenv("CORVISTA_DATA_DIR", "/var/elsewhere/", 1);
    host.file("/var/elsewhere/asset.dat", "Computer.OwnerName=here\n");
    host.file(kAssetFile, "Computer.OwnerName=not here\n");
    EXPECT_EQ(RunningComputer().text(116), "here");
}

HOST_TEST(Owner, FollowsTheDataDirectoryWithoutASlashOfItsOwn) {
    host.directory("/var/data");
    IC::OwnerData("/var/data").write(IC::OwnerData::name, "text");
    EXPECT_EQ(host.read("/var/dataasset.dat"), "Computer.OwnerName=text\n");
    EXPECT_EQ(IC::OwnerData("/var/data").read(IC::OwnerData::name), "text");
}

HOST_TEST(Owner, WithoutItsKeyIsAnEmptyText) {
    for (const char* content : {"Computer.OwnerContact=only this\n", "", "damaged\n"}) {
        host.file(kAssetFile, content);
        const RunningComputer computer;
        EXPECT_EQ(computer.text(116), "");
        EXPECT_EQ(computer.read(116).kind(), IC::PropertyValue::text);
    }
}

HOST_TEST(Owner, CannotBeReadWithoutTheFile) {
    LogCapture capture;
    RunningComputer computer;
    for (const Field& field : kFields) {
        capture.clear();
        IC::PropertyValue value("left over", true);
        EXPECT_EQ(computer.node().getProperty(field.id, value).getStatus(), 1);
        EXPECT_EQ(value.kind(), IC::PropertyValue::none);
        EXPECT_THAT(
            capture.messages(),
            TextsAre("ComputerNode::getProperty: entry",
                     "ComputerNode::getProperty : OwnerContact/OwnerName - Cannot read asset dat file.",
                     "ComputerNode::getProperty: exit"));
        EXPECT_EQ(capture.messages(5000).size(), 1U);
    }
    EXPECT_FALSE(host.exists(kAssetFile));
}

HOST_TEST(Owner, CannotBeReadOrWrittenWithoutADataDirectory) {
    setenv("CORVISTA_DATA_DIR", "", 1);
    host.file(kAssetFile, "Computer.OwnerName=old\n");
    LogCapture capture;
    RunningComputer computer;
    for (const Field& field : kFields) {
        IC::PropertyValue value;
        capture.clear();
        EXPECT_EQ(computer.node().getProperty(field.id, value).getStatus(), 1);
        EXPECT_EQ(value.kind(), IC::PropertyValue::none);
        EXPECT_EQ(computer.write(field.id, "new"), 1);
        EXPECT_THAT(capture.messages(5000),
                    TextsAre("ComputerNode::getProperty : OwnerContact/OwnerName - NULL returned by "
                             "CorvistaUtilities::getMoraineDataDir();",
                             "ComputerNode::setProperty : OwnerContact/OwnerName - NULL returned by "
                             "CorvistaUtilities::getMoraineDataDir()"));
        EXPECT_FALSE(computer.stores(field.id));
    }
    EXPECT_EQ(host.read(kAssetFile), "Computer.OwnerName=old\n");
}

HOST_TEST(Owner, IsWrittenToTheFileAndKeptByTheFramework) {
    host.directory("/opt/vantrel/corvista/data");
    RunningComputer computer;
    EXPECT_EQ(computer.write(116, "Jane Roe"), 0);
    EXPECT_EQ(computer.write(115, "roe@example.org"), 0);
    EXPECT_EQ(host.read(kAssetFile), "Computer.OwnerContact=roe@example.org\nComputer.OwnerName=Jane Roe\n");
    EXPECT_EQ(computer.text(115), "roe@example.org");
    EXPECT_EQ(computer.text(116), "Jane Roe");
    EXPECT_EQ(static_cast<std::string>(computer.stored(115)), "roe@example.org");
    EXPECT_EQ(static_cast<std::string>(computer.stored(116)), "Jane Roe");
    EXPECT_THAT(host.calls(), IsEmpty());
}

HOST_TEST(Owner, KeepsTheOtherKeysOfTheFile) {
    host.file(kAssetFile, "Another.Key=kept\nComputer.OwnerName=old\nZ=last\n");
    EXPECT_EQ(RunningComputer().write(116, "new"), 0);
    EXPECT_EQ(host.read(kAssetFile), "Another.Key=kept\nComputer.OwnerName=new\nZ=last\n");
}

HOST_TEST(Owner, TakesEveryText) {
    host.directory("/opt/vantrel/corvista/data");
    RunningComputer computer;
    const std::string texts[] = {"",
                                 "two\nlines",
                                 "a=b\\c",
                                 "$(reboot); `halt` | 'x' \"y\" & *",
                                 "\xff\xfe is not UTF-8",
                                 "\xe6\x97\xa5\xe6\x9c\xac \xf0\x9f\x90\xa7",
                                 std::string(100000, 'x')};
    for (const std::string& text : texts) {
        EXPECT_EQ(computer.write(115, text), 0);
        EXPECT_EQ(computer.text(115), text);
    }
    EXPECT_EQ(computer.write(115, 4711U), 0);
    EXPECT_EQ(computer.text(115), "4711");
    EXPECT_THAT(host.calls(), IsEmpty());
}

/// What a write that cannot be done leaves: the old file and the framework's old value.
void expectRefusal(FakeHost& host, const std::string& content) {
    RunningComputer computer;
    LogCapture capture;
    EXPECT_EQ(computer.write(116, std::string(20000, 'n')), 1);
    EXPECT_THAT(capture.messages(),
                TextsAre("ComputerNode::setProperty: entry",
                         "ComputerNode::setProperty : OwnerContact/OwnerName - Cannot write asset dat file.",
                         "ComputerNode::setProperty: exit"));
    EXPECT_EQ(capture.messages(5000).size(), 1U);
    EXPECT_FALSE(computer.stores(116));
    EXPECT_EQ(host.read(kAssetFile), content);
}

HOST_TEST(Owner, IsNotWrittenOnAReadOnlyFileSystem) {
    host.file(kAssetFile, "Computer.OwnerName=old\n");
    host.readOnly("/opt/vantrel/corvista/data");
    expectRefusal(host, "Computer.OwnerName=old\n");
}

HOST_TEST(Owner, IsNotWrittenOnAFullDisk) {
    host.file(kAssetFile, "Computer.OwnerName=old\n");
    host.fullDisk("/opt/vantrel/corvista/data");
    expectRefusal(host, "Computer.OwnerName=old\n");
}

HOST_TEST(Owner, IsOnlyStoredBeforeStartUpHasEnded) {
    host.file(kAssetFile, "Computer.OwnerContact=old\n");
    RunningComputer computer;
    IC::OSHWMI::bInitflag = false;
    EXPECT_EQ(computer.write(115, "new"), 0);
    EXPECT_EQ(static_cast<std::string>(computer.stored(115)), "new");
    EXPECT_EQ(host.read(kAssetFile), "Computer.OwnerContact=old\n");
    EXPECT_EQ(computer.text(115), "old");
}

}  // namespace
