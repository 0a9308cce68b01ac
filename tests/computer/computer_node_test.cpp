#include "computer/computer_node.h"

#include <gmock/gmock.h>

#include <climits>
#include <cstdlib>
#include <ctime>
#include <filesystem>

#include "mi/my_process.h"
#include "tests/computer/computer_tools.h"
#include "tests/computer/failing_calls.h"
#include "tests/support/failing_new.h"
#include "tests/support/fake_host.h"
#include "tests/support/log_capture.h"
#include "tests/support/texts_are.h"

namespace {

using IC::Number;
using IC::PropertyValue;
using testing::ElementsAre;
using testing::IsEmpty;

TEST(Computer, LogsItsBeginningAndItsEnd) {
    LogCapture capture;
    { const IC::ComputerNode node(7, 2, {1, 4}, 40, 0); }
    EXPECT_THAT(capture.messages(3000),
                TextsAre("ComputerNode::ComputerNode: entry", "ComputerNode::ComputerNode: exit",
                         "ComputerNode::~ComputerNode: entry", "ComputerNode::~ComputerNode: exit"));
    EXPECT_TRUE(capture.everyLineTwice());
}

TEST(Computer, PassesItsFiveArgumentsOn) {
    const IC::ComputerNode node(7, 2, {1, 4}, 40, 5);
    EXPECT_EQ(node.getNodeId(), 7U);
    EXPECT_EQ(node.getLinkedId(), 2U);
    EXPECT_EQ(node.getMIIds(), (std::vector<unsigned int>{1, 4}));
    EXPECT_EQ(node.nodeType(), 40U);
    EXPECT_EQ(node.getIndex(), 5U);
}

HOST_TEST(Computer, AnswersOtherIdsFromTheFrameworksStore) {
    RunningComputer computer;
    for (const unsigned int id :
         {0U, 1U, 107U, 109U, 114U, 117U, 122U, 123U, 124U, 125U, 128U, 199U, 201U, 999U, UINT_MAX}) {
        PropertyValue value("left over", true);
        EXPECT_EQ(computer.node().getProperty(id, value).getStatus(), 1) << id;
        EXPECT_EQ(value.kind(), PropertyValue::none) << id;
        EXPECT_EQ(computer.write(id, "stored"), id == 123 ? 1 : 0) << id;
        if (id != 123) {
            EXPECT_EQ(computer.text(id), "stored") << id;
        }
    }
    EXPECT_THAT(host.calls(), IsEmpty());
    EXPECT_THAT(host.clockCalls(), IsEmpty());
}

HOST_TEST(Computer, AReadThatFindsNoMemoryFails) {
    const RunningComputer computer;
    const std::string name = "a-host-whose-name-is-no-short-text";
    ASSERT_EQ(sethostname(name.data(), name.size()), 0);
    int failures = 0;
    for (long allocation = 0, failed = 1; failed != 0; ++allocation) {
        const FailingOnce once(allocation);
        EXPECT_NO_THROW(failures += computer.status(108)) << allocation;
        failed = once.happened() ? 1 : 0;
    }
    EXPECT_GT(failures, 0);
    EXPECT_EQ(computer.text(108), name);
}

HOST_TEST(Computer, LogsEntryAndExitOfEveryReadAndWrite) {
    RunningComputer computer;
    LogCapture capture;
    computer.read(200);
    computer.write(1, "x");
    EXPECT_THAT(capture.messages(),
                TextsAre("ComputerNode::getProperty: entry", "ComputerNode::getProperty: exit",
                         "ComputerNode::setProperty: entry", "ComputerNode::setProperty: exit"));
    EXPECT_EQ(capture.messages(3000).size(), 4U);
    EXPECT_TRUE(capture.everyLineTwice());
}

HOST_TEST(Computer, AlwaysGivesOneFor200) {
    RunningComputer computer;
    EXPECT_EQ(computer.write(200, 7U), 0);
    const PropertyValue value = computer.read(200);
    ASSERT_NE(value.asNumber(), nullptr);
    EXPECT_EQ(*value.asNumber(), Number(1U));
    EXPECT_TRUE(value.known());
}

HOST_TEST(ComputerName, IsTheKernelsWholeName) {
    const RunningComputer computer;
    const std::string longest(64, 'n');
    for (const std::string& name : {std::string("alpha"), std::string("alpha.example.org"), longest}) {
        host.setHostName(name);
        EXPECT_EQ(computer.text(108), name);
    }
    EXPECT_EQ(computer.read(108).kind(), PropertyValue::text);
    EXPECT_THAT(host.calls(), IsEmpty());
}

HOST_TEST(ComputerName, LosesItsLineBreaksAtTheEndAlone) {
    const RunningComputer computer;
    const std::pair<std::string, std::string> names[] = {
        {"alpha\n", "alpha"}, {"alpha\n\n", "alpha"}, {"al\npha\n", "al\npha"}, {"\n\n", ""}, {"a \n", "a "}};
    for (const auto& [kernel, expected] : names) {
        host.setHostName(kernel);
        EXPECT_EQ(computer.text(108), expected);
    }
}

HOST_TEST(ComputerName, SaysWhenTheKernelDoesNot) {
    FailingCalls::getHostName = true;
    RunningComputer computer;
    LogCapture capture;
    PropertyValue value("left over", true);
    EXPECT_EQ(computer.node().getProperty(108, value).getStatus(), 1);
    EXPECT_EQ(value.kind(), PropertyValue::none);
    EXPECT_THAT(
        capture.messages(),
        TextsAre("ComputerNode::getProperty: entry", "ComputerNode::getProperty Name Inside Case",
                 "ComputerNode::getProperty Name::GetHostname Failed", "ComputerNode::getProperty: exit"));
    EXPECT_THAT(capture.messages(6000), TextsAre("ComputerNode::getProperty Name::GetHostname Failed"));
}

HOST_TEST(ComputerName, IsOnlyStoredWhenWritten) {
    RunningComputer computer;
    EXPECT_EQ(computer.write(108, "other"), 0);
    EXPECT_EQ(computer.text(108), "localhost");
    EXPECT_EQ(static_cast<std::string>(computer.stored(108)), "other");
    EXPECT_THAT(host.calls(), IsEmpty());
}

HOST_TEST(ComputerPower, RestartsOrHaltsWithOneCommand) {
    const std::pair<unsigned int, const char*> actions[] = {{9, "shutdown -r now"}, {12, "shutdown -h now"}};
    RunningComputer computer;
    const int before = IC::MyProcess::cnt;
    for (const auto& [action, command] : actions) {
        host.clearCalls();
        EXPECT_EQ(computer.write(123, action), 0);
        EXPECT_THAT(host.calls(), ElementsAre(command));
        EXPECT_EQ(static_cast<unsigned int>(computer.stored(123)), action);
    }
    EXPECT_EQ(IC::MyProcess::cnt, before);
}

HOST_TEST(ComputerPower, TakesNumbersEnumerationsAndNumericTexts) {
    RunningComputer computer;
    EXPECT_EQ(computer.write(123, PropertyValue(IC::EnumValue(9), true)), 0);
    EXPECT_EQ(computer.write(123, "12"), 0);
    EXPECT_THAT(host.calls(), TextsAre("shutdown -r now", "shutdown -h now"));
}

HOST_TEST(ComputerPower, RunsNothingForAnyOtherNumber) {
    RunningComputer computer;
    for (const unsigned int action : {0U, 1U, 8U, 10U, 11U, 13U, 90U, UINT_MAX}) {
        EXPECT_EQ(computer.write(123, action), 0);
        EXPECT_EQ(static_cast<unsigned int>(computer.stored(123)), action);
    }
    EXPECT_THAT(host.calls(), IsEmpty());
}

HOST_TEST(ComputerPower, RefusesWhatIsNoNumber) {
    RunningComputer computer;
    for (const char* text : {"", "restart", "9 ", "9; reboot", "0x9"}) {
        EXPECT_EQ(computer.write(123, text), 1) << text;
    }
    EXPECT_EQ(computer.write(123, PropertyValue()), 1);
    EXPECT_FALSE(computer.stores(123));
    EXPECT_THAT(host.calls(), IsEmpty());
}

HOST_TEST(ComputerPower, DoesNotTellWhetherTheCommandSucceeded) {
    host.tool("shutdown %any", "no rights\n", 1);
    RunningComputer computer;
    EXPECT_EQ(computer.write(123, 9U), 0);
    host.toolMissing("shutdown");
    EXPECT_EQ(computer.write(123, 12U), 0);
    EXPECT_THAT(host.calls(), TextsAre("shutdown -r now"));
}

HOST_TEST(ComputerPower, IsOnlyStoredBeforeStartUpHasEnded) {
    RunningComputer computer;
    IC::OSHWMI::bInitflag = false;
    EXPECT_EQ(computer.write(123, 9U), 0);
    EXPECT_EQ(computer.text(123), "9");
    EXPECT_THAT(host.calls(), IsEmpty());
}

HOST_TEST(ComputerClock, ReadsAsSecondsWithScaleZero) {
    const RunningComputer computer;
    const long before = time(nullptr);
    const PropertyValue value = computer.read(126);
    const long after = time(nullptr);
    ASSERT_NE(value.asNumber(), nullptr);
    EXPECT_EQ(value.asNumber()->kind(), Number::scaled);
    EXPECT_THAT(std::stol(value.asNumber()->toString()),
                testing::AllOf(testing::Ge(before), testing::Le(after)));
    EXPECT_EQ(*value.asNumber(), Number(std::stol(value.asNumber()->toString()), 0));
}

HOST_TEST(ComputerClock, IsSetByADateTimeText) {
    setenv("TZ", "XXX-5:30", 1);
    RunningComputer computer;
    LogCapture capture;
    const std::pair<const char*, long> texts[] = {{"2001-09-09T01:46:40Z", 1000000000},
                                                  {"2001-09-09T03:46:40+02:00", 1000000000},
                                                  {"2001-09-09T07:16:40", 1000000000},
                                                  {"1970-01-01T00:00:00Z", 0},
                                                  {"2038-01-19T03:14:07Z", 2147483647}};
    for (const auto& [text, seconds] : texts) {
        EXPECT_EQ(computer.write(126, text), 0) << text;
        const ClockCall call = host.clockCalls().back();
        EXPECT_EQ(call.function, "settimeofday");
        EXPECT_EQ(call.seconds, seconds) << text;
        EXPECT_EQ(call.microseconds, 0);
        EXPECT_FALSE(call.timeZone);
    }
    EXPECT_EQ(host.clockCalls().size(), std::size(texts));
    EXPECT_FALSE(computer.stores(126));
    EXPECT_THAT(host.calls(), IsEmpty());
    EXPECT_THAT(capture.messages(6000), IsEmpty());
}

HOST_TEST(ComputerClock, SaysHonestlyWhatThisPlatformCannotHold) {
    RunningComputer computer;
    const bool narrow = sizeof(long) == 4;
    EXPECT_EQ(computer.write(126, "2038-01-19T03:14:08Z"), narrow ? 1 : 0);
    EXPECT_EQ(host.clockCalls().size(), narrow ? 0U : 1U);
    if (!narrow) {
        EXPECT_EQ(host.clockCalls().back().seconds, 2147483648LL);
    }
}

HOST_TEST(ComputerClock, IsLeftAloneByWhatIsNoDateTime) {
    RunningComputer computer;
    LogCapture capture;
    for (const char* text :
         {"", "now", "1000000000", "2001-02-30T00:00:00Z", "2001-09-09T01:46:40Z; reboot"}) {
        EXPECT_EQ(computer.write(126, text), 1) << text;
    }
    EXPECT_EQ(computer.write(126, 1000000000U), 1);
    EXPECT_EQ(computer.write(126, PropertyValue()), 1);
    EXPECT_THAT(host.clockCalls(), IsEmpty());
    EXPECT_FALSE(computer.stores(126));
    EXPECT_THAT(capture.messages(5000), IsEmpty());
    EXPECT_THAT(capture.messages(6000), IsEmpty());
}

HOST_TEST(ComputerClock, SaysWhenTheKernelRefuses) {
    host.clockFails(EPERM);
    RunningComputer computer;
    LogCapture capture;
    EXPECT_EQ(computer.write(126, "2001-09-09T01:46:40Z"), 1);
    EXPECT_EQ(host.clockCalls().size(), 1U);
    EXPECT_THAT(capture.messages(),
                TextsAre("ComputerNode::setProperty: entry", "ComputerNode::setProperty: exit"));
}

HOST_TEST(ComputerClock, IsOnlyStoredBeforeStartUpHasEnded) {
    RunningComputer computer;
    IC::OSHWMI::bInitflag = false;
    EXPECT_EQ(computer.write(126, "2001-09-09T01:46:40Z"), 0);
    EXPECT_THAT(host.clockCalls(), IsEmpty());
    EXPECT_TRUE(computer.stores(126));
}

HOST_TEST(ComputerZone, ReadsTheOffsetInForceInMinutes) {
    const RunningComputer computer;
    // Summer all the year round in the last two: from the first day to the last hour of the last one.
    const std::pair<const char*, double> zones[] = {{"UTC0", 0},
                                                    {"XXX-5:30", 330},
                                                    {"XXX+3:30", -210},
                                                    {"XXX+11", -660},
                                                    {"XXX-12", 720},
                                                    {"XXX-0:30:59", 30},
                                                    {"XXX+0:30:59", -30},
                                                    {"XXX-1YYY-2,0/0,J365/25", 120},
                                                    {"XXX5YYY4,0/0,J365/25", -240}};
    for (const auto& [zone, minutes] : zones) {
        setenv("TZ", zone, 1);
        const PropertyValue value = computer.read(127);
        ASSERT_NE(value.asNumber(), nullptr);
        EXPECT_EQ(*value.asNumber(), Number(minutes)) << zone;
        EXPECT_EQ(value.asNumber()->kind(), Number::real);
    }
    EXPECT_THAT(host.calls(), IsEmpty());
}

std::string bigEndian(unsigned int value) {
    std::string bytes;
    for (int shift = 24; shift >= 0; shift -= 8) {
        bytes += static_cast<char>(value >> shift & 0xff);
    }
    return bytes;
}

/// A compiled zone file of one fixed offset.
std::string compiledZone(int minutes) {
    const std::string header = "TZif" + std::string(16, '\0');
    const std::string counts = std::string(16, '\0') + bigEndian(1) + bigEndian(4);
    return header + counts + bigEndian(static_cast<unsigned int>(minutes * 60)) + std::string(2, '\0') +
           std::string("XXX\0", 4);
}

HOST_TEST(ComputerZone, FollowsAChangeOfTheHostsZoneInTheSameProcess) {
    const RunningComputer computer;
    for (const int minutes : {60, 330, -210, 0}) {
        host.file("/etc/new", compiledZone(minutes));
        std::filesystem::rename("/etc/new", "/etc/localtime");
        EXPECT_EQ(computer.read(127), PropertyValue(Number(static_cast<double>(minutes)), true));
    }
}

HOST_TEST(ComputerZone, IsSwitchedByAnOffsetOfTheTableInAnyForm) {
    RunningComputer computer;
    const std::pair<PropertyValue, const char*> values[] = {
        {PropertyValue(Number(330U), true), "/usr/share/zoneinfo/Asia/Kolkata"},
        {PropertyValue(Number(4294967236U), true), "/usr/share/zoneinfo/Atlantic/Azores"},
        {PropertyValue(Number(-210L, 0), true), "/usr/share/zoneinfo/America/St_Johns"},
        {PropertyValue(Number(540.0), true), "/usr/share/zoneinfo/Japan"},
        {PropertyValue("-660", true), "/usr/share/zoneinfo/Pacific/Midway"},
    };
    for (const auto& [value, link] : values) {
        EXPECT_EQ(computer.write(127, value), 0) << link;
        EXPECT_EQ(std::filesystem::read_symlink("/etc/localtime"), link);
    }
    EXPECT_THAT(host.calls(), IsEmpty());
}

HOST_TEST(ComputerZone, RefusesAnythingElse) {
    host.file("/etc/sysconfig/clock", "TIMEZONE=\"old\"\n");
    host.file("/etc/localtime", "old");
    RunningComputer computer;
    for (const char* text : {"345", "-1", "", "CET", "60 minutes", "330.5"}) {
        EXPECT_EQ(computer.write(127, text), 1) << text;
    }
    EXPECT_EQ(computer.write(127, PropertyValue()), 1);
    EXPECT_EQ(host.read("/etc/sysconfig/clock"), "TIMEZONE=\"old\"\n");
    EXPECT_EQ(host.read("/etc/localtime"), "old");
    EXPECT_FALSE(host.exists("/etc/localtime.bak"));
    EXPECT_FALSE(computer.stores(127));
}

HOST_TEST(ComputerZone, SaysWhenTheLinkCannotBeMade) {
    host.file("/etc/localtime", "old");
    host.readOnly("/etc");
    const LogCapture capture;
    EXPECT_EQ(RunningComputer().write(127, 330U), 1);
    EXPECT_EQ(host.read("/etc/localtime"), "old");
}

HOST_TEST(ComputerZone, IsOnlyStoredBeforeStartUpHasEnded) {
    host.file("/etc/localtime", "old");
    RunningComputer computer;
    IC::OSHWMI::bInitflag = false;
    EXPECT_EQ(computer.write(127, 330U), 0);
    EXPECT_EQ(host.read("/etc/localtime"), "old");
    EXPECT_TRUE(computer.stores(127));
}

}  // namespace
