// /etc/localtime and the log of a zone switch.
#include <gmock/gmock.h>

#include <filesystem>

#include "computer/time_zone.h"
#include "tests/computer/computer_host.h"
#include "tests/computer/failing_calls.h"
#include "tests/support/fake_host.h"
#include "tests/support/log_capture.h"
#include "tests/support/texts_are.h"

namespace {

using testing::IsEmpty;

constexpr unsigned int kJapan = 540;
constexpr char kLink[] = "/etc/localtime";
constexpr char kOld[] = "/etc/localtime.bak";

std::string target(const char* path) {
    return std::filesystem::read_symlink(path);
}

HOST_TEST(ZoneSwitch, WritesTheTextOfTheZoneAndLinksItsFile) {
    host.file("/etc/sysconfig/clock", "TIMEZONE=\"CET\"\n");
    EXPECT_TRUE(IC::setTimezone(kIndia));
    EXPECT_EQ(host.read("/etc/sysconfig/clock"), "TIMEZONE=\"Asia/Kolkata\"\n");
    EXPECT_EQ(target(kLink), "/usr/share/zoneinfo/Asia/Kolkata");
    EXPECT_TRUE(IC::setTimezone(kJapan));
    EXPECT_EQ(host.read("/etc/sysconfig/clock"), "TIMEZONE=\"JST\"\n");
    EXPECT_EQ(target(kLink), "/usr/share/zoneinfo/Japan");
    EXPECT_EQ(target(kOld), "/usr/share/zoneinfo/Asia/Kolkata");
    EXPECT_THAT(host.calls(), IsEmpty());
}

HOST_TEST(ZoneSwitch, LeavesTheOldFileBehind) {
    host.file(kLink, "compiled zone");
    host.file(kOld, "older still");
    EXPECT_TRUE(IC::setTimezone(kIndia));
    EXPECT_EQ(host.read(kOld), "compiled zone");
}

HOST_TEST(ZoneSwitch, NeedsNoOldFile) {
    EXPECT_TRUE(IC::setTimezone(kIndia));
    EXPECT_EQ(target(kLink), "/usr/share/zoneinfo/Asia/Kolkata");
    EXPECT_FALSE(host.exists(kOld));
}

HOST_TEST(ZoneSwitch, LogsTheZoneBetweenEnterAndExit) {
    LogCapture capture;
    EXPECT_TRUE(IC::setTimezone(kJapan));
    EXPECT_THAT(capture.messages(), TextsAre("setTimezone: enter", "tz_file: /usr/share/zoneinfo/Japan",
                                             "tz_string: JST", "setTimezone: exit"));
    EXPECT_EQ(capture.messages(3000).size(), 4U);
    EXPECT_TRUE(capture.everyLineTwice());
}

HOST_TEST(ZoneSwitch, TouchesNothingForAnUnknownOffset) {
    host.file("/etc/sysconfig/clock", "TIMEZONE=\"CET\"");
    host.file("/etc/sysconfig/clock.bak", "left over");
    host.file(kLink, "old");
    LogCapture capture;
    for (const unsigned int offset : {345U, 1U, 59U, 61U, 1000U}) {
        capture.clear();
        EXPECT_FALSE(IC::setTimezone(offset));
        EXPECT_THAT(capture.messages(), TextsAre("setTimezone: enter"));
    }
    EXPECT_EQ(host.read("/etc/sysconfig/clock"), "TIMEZONE=\"CET\"");
    EXPECT_EQ(host.read("/etc/sysconfig/clock.bak"), "left over");
    EXPECT_EQ(host.read(kLink), "old");
    EXPECT_FALSE(host.exists(kOld));
}

HOST_TEST(ZoneSwitch, PutsTheOldFileBackWhenTheLinkFailsButKeepsTheNewText) {
    host.file("/etc/sysconfig/clock", "TIMEZONE=\"CET\"\n");
    host.file(kLink, "old");
    FailingCalls::symbolicLink = true;
    LogCapture capture;
    EXPECT_FALSE(IC::setTimezone(kIndia));
    EXPECT_EQ(host.read(kLink), "old");
    EXPECT_FALSE(host.exists(kOld));
    EXPECT_EQ(host.read("/etc/sysconfig/clock"), "TIMEZONE=\"Asia/Kolkata\"\n");
    EXPECT_THAT(capture.messages(6000), IsEmpty());
    EXPECT_EQ(capture.messages().back(), "setTimezone: exit");
}

HOST_TEST(ZoneSwitch, SaysWhenTheOldFileCannotBePutBack) {
    FailingCalls::symbolicLink = true;
    LogCapture capture;
    EXPECT_FALSE(IC::setTimezone(kIndia));
    EXPECT_THAT(capture.messages(6000), TextsAre("rename /etc/localtime.bak to /etc/localtime failed"));
    EXPECT_EQ(capture.messages().back(), "setTimezone: exit");
}

HOST_TEST(ZoneSwitch, FailsOnAReadOnlyFileSystem) {
    host.file("/etc/sysconfig/clock", "TIMEZONE=\"CET\"\n");
    host.file(kLink, "old");
    host.readOnly("/etc");
    LogCapture capture;
    EXPECT_FALSE(IC::setTimezone(kIndia));
    EXPECT_EQ(host.read(kLink), "old");
    EXPECT_EQ(host.read("/etc/sysconfig/clock"), "TIMEZONE=\"CET\"\n");
    EXPECT_THAT(capture.messages(6000), TextsAre("rename /etc/localtime.bak to /etc/localtime failed"));
}

}  // namespace
