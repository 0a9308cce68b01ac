// /etc/sysconfig/clock as a zone switch and a change of the hardware clock's mode leave it.
#include <gmock/gmock.h>
#include <sys/mount.h>

#include "computer/time_zone.h"
#include "tests/computer/computer_host.h"
#include "tests/computer/computer_tools.h"
#include "tests/support/fake_host.h"
#include "tests/support/log_capture.h"
#include "tests/support/texts_are.h"

namespace {

using testing::ElementsAre;
using testing::IsEmpty;

constexpr char kCopy[] = "/etc/sysconfig/clock.bak";
constexpr char kCopyCommand[] = "/bin/cp /etc/sysconfig/clock /etc/sysconfig/clock.bak";

struct Change {
    const char* story;
    std::string before;
    std::string after;
};

/// The same stories for both keys: KEY stands for the key, NEW for the new line without its line break.
std::vector<Change> changes() {
    return {
        {"comments, order and unknown keys stay",
         "## Path: System\n#\n# KEY=\"comment\"\nOTHER=\"x\"\n  KEY=\"indented\"\n\nKEY=\"old\"\nLAST='y'\n",
         "## Path: System\n#\n# KEY=\"comment\"\nOTHER=\"x\"\n  KEY=\"indented\"\n\nNEW\nLAST='y'\n"},
        {"only the first line with the key changes", "A=1\nKEY=\"1\"\nKEY=\"2\"\nKEY=\"3\"\n",
         "A=1\nNEW\nKEY=\"2\"\nKEY=\"3\"\n"},
        {"the key is the line's beginning, whatever follows", "KEY_OLD=\"x\"\nKEY=\"y\"\n",
         "NEW\nKEY=\"y\"\n"},
        {"a key in small letters is another key", "key=\"x\"\n", "key=\"x\"\n"},
        {"without the key nothing is added", "A=1\n\n\nB=2\n", "A=1\n\n\nB=2\n"},
        {"a last line gets its line break", "A=1\nB=2", "A=1\nB=2\n"},
        {"so does a last line with the key", "A=1\nKEY=\"x\"", "A=1\nNEW\n"},
        {"CR-LF lines keep their CR, the new line has none", "A=1\r\nKEY=\"x\"\r\nB=2\r\n",
         "A=1\r\nNEW\nB=2\r\n"},
        {"an empty file stays empty", "", ""},
        {"bytes that are no text stay", std::string("\xff\0\x01\nKEY=\n\xc3", 10),
         std::string("\xff\0\x01\nNEW\n\xc3\n", 10)},
        {"long lines of others stay",
         lineOf(511, "A=") + "\n" + lineOf(512, "B=") + "\n" + lineOf(513, "C=") + "\n" + lineOf(5000, "D=") +
             "\nKEY=\n",
         lineOf(511, "A=") + "\n" + lineOf(512, "B=") + "\n" + lineOf(513, "C=") + "\n" + lineOf(5000, "D=") +
             "\nNEW\n"},
        {"a line of any length is replaced", "KEY=" + std::string(5000, 'x') + "\nKEY=\n", "NEW\nKEY=\n"},
    };
}

std::string filled(std::string text, const std::string& key, const std::string& line) {
    const auto replaceAll = [&text](const std::string& from, const std::string& to) {
        for (auto at = text.find(from); at != std::string::npos; at = text.find(from, at + to.size())) {
            text.replace(at, from.size(), to);
        }
    };
    replaceAll("NEW", line);
    replaceAll("KEY", key);
    return text;
}

void makeCopyTool(FakeHost& host) {
    ToolAnswer copy;
    copy.action = "cat \"$1\" > \"$2\"";
    host.tool(kCopyCommand, copy);
}

HOST_TEST(ZoneInClockFile, ChangesTheFirstTimezoneLineAlone) {
    for (const Change& change : changes()) {
        host.file(kClock, filled(change.before, "TIMEZONE", ""));
        EXPECT_TRUE(IC::setTimezone(kIndia)) << change.story;
        EXPECT_EQ(host.read(kClock), filled(change.after, "TIMEZONE", "TIMEZONE=\"Asia/Kolkata\""))
            << change.story;
        EXPECT_FALSE(host.exists(kCopy)) << change.story;
        host.remove("/etc/localtime");
    }
    EXPECT_THAT(host.calls(), IsEmpty());
}

HOST_TEST(ZoneInClockFile, DoesNotCreateAMissingFile) {
    host.directory("/etc/sysconfig");
    EXPECT_TRUE(IC::setTimezone(kIndia));
    EXPECT_THAT(host.listDirectory("/etc/sysconfig"), IsEmpty());
    EXPECT_TRUE(host.exists("/etc/localtime"));
}

HOST_TEST(ZoneInClockFile, OverwritesAnOldCopy) {
    host.file(kClock, "TIMEZONE=\"x\"\n");
    host.file(kCopy, "something old and much longer than the file itself\n");
    EXPECT_TRUE(IC::setTimezone(kIndia));
    EXPECT_EQ(host.read(kClock), "TIMEZONE=\"Asia/Kolkata\"\n");
    EXPECT_FALSE(host.exists(kCopy));
}

HOST_TEST(ZoneInClockFile, TakesAnOldCopyWhenTheFileItselfIsGone) {
    host.file(kCopy, "TIMEZONE=\"x\"\n");
    EXPECT_TRUE(IC::setTimezone(kIndia));
    EXPECT_EQ(host.read(kClock), "TIMEZONE=\"x\"\n");
    EXPECT_FALSE(host.exists(kCopy));
}

HOST_TEST(ClockFile, IsNotEmptiedByADirectoryInTheCopysPlace) {
    makeCopyTool(host);
    host.file(kClock, "TIMEZONE=\"x\"\nHWCLOCK=\"x\"\n");
    host.directory(kCopy);
    EXPECT_TRUE(IC::setTimezone(kIndia));
    EXPECT_FALSE(IC::setAutoDSTEnabled(true));
    EXPECT_EQ(host.read(kClock), "TIMEZONE=\"x\"\nHWCLOCK=\"x\"\n");
    host.remove(kClock);
    EXPECT_FALSE(IC::setAutoDSTEnabled(true));
    EXPECT_FALSE(host.exists(kClock));
}

HOST_TEST(ZoneInClockFile, LeavesTheFileOnAReadOnlyFileSystemAndSwitchesTheLink) {
    host.file(kClock, "TIMEZONE=\"x\"\n");
    host.readOnly("/etc/sysconfig");
    EXPECT_TRUE(IC::setTimezone(kIndia));
    EXPECT_EQ(host.read(kClock), "TIMEZONE=\"x\"\n");
    EXPECT_TRUE(host.exists("/etc/localtime"));
}

HOST_TEST(ZoneInClockFile, KeepsTheFileWholeOnAFullDisk) {
    host.file(kClock, "# comment\nTIMEZONE=\"x\"\n");
    host.fullDisk("/etc/sysconfig");
    LogCapture capture;
    EXPECT_TRUE(IC::setTimezone(kIndia));
    EXPECT_EQ(host.read(kClock), "# comment\nTIMEZONE=\"x\"\n");
    EXPECT_FALSE(host.exists(kCopy));
    EXPECT_THAT(capture.messages(6000), TextsAre("Could not write all of '/etc/sysconfig/clock.bak'."));
}

/// A disk that holds the clock file and no more than half of its copy.
std::string fillDisk(FakeHost& host, const std::string& keyLine) {
    host.directory("/etc/sysconfig");
    EXPECT_EQ(mount("small", "/etc/sysconfig", "tmpfs", 0, "size=12k"), 0);
    std::string text = keyLine + "\n" + std::string(5000, '#') + "\n";
    host.file(kClock, text);
    return text;
}

HOST_TEST(ZoneInClockFile, StaysAsItWasWhenTheDiskHasNoRoomForItsCopy) {
    const std::string before = fillDisk(host, "TIMEZONE=\"x\"");
    LogCapture capture;
    EXPECT_TRUE(IC::setTimezone(kIndia));
    EXPECT_EQ(host.read(kClock), before);
    EXPECT_FALSE(host.exists(kCopy));
    EXPECT_TRUE(host.exists("/etc/localtime"));
    EXPECT_THAT(capture.messages(6000), TextsAre("Could not write all of '/etc/sysconfig/clock.bak'."));
}

HOST_TEST(ZoneInClockFile, LosesItsCopyAlsoWhenItCannotBeTakenBack) {
    host.directory("/etc/sysconfig");
    host.directory("/etc/disk");
    ASSERT_EQ(mount("small", "/etc/disk", "tmpfs", 0, "size=4k"), 0);
    const std::string before = "TIMEZONE=\"x\"\n" + std::string(4080, '#') + "\n";
    host.file("/etc/disk/clock", before);
    host.symlink(kClock, "/etc/disk/clock");
    LogCapture capture;
    EXPECT_TRUE(IC::setTimezone(kIndia));
    EXPECT_EQ(host.read(kClock), before);
    EXPECT_FALSE(host.exists(kCopy));
    EXPECT_THAT(capture.messages(6000), TextsAre("Could not write all of '/etc/sysconfig/clock'."));
}

HOST_TEST(HardwareClockMode, ChangesTheFirstHwclockLineAlone) {
    makeCopyTool(host);
    for (const Change& change : changes()) {
        const bool found = change.after.find("NEW") != std::string::npos;
        for (const bool utc : {true, false}) {
            host.file(kClock, filled(change.before, "HWCLOCK", ""));
            host.clearCalls();
            EXPECT_EQ(IC::setAutoDSTEnabled(utc), found) << change.story;
            const char* line = utc ? "HWCLOCK=\"-u\"" : "HWCLOCK=\"--localtime\"";
            EXPECT_EQ(host.read(kClock), filled(change.after, "HWCLOCK", line)) << change.story;
            EXPECT_FALSE(host.exists(kCopy)) << change.story;
            EXPECT_THAT(host.calls(), ElementsAre(kCopyCommand));
        }
    }
}

HOST_TEST(HardwareClockMode, LogsEntryTheOpenPipesAndExit) {
    makeCopyTool(host);
    host.file(kClock, "HWCLOCK=\"-u\"\n");
    LogCapture capture;
    EXPECT_TRUE(IC::setAutoDSTEnabled(true));
    EXPECT_EQ(capture.messages().front(), "setAutoDSTEnabled: entry");
    EXPECT_THAT(capture.messages(), testing::Contains("mypopen():  Count value 1"));
    EXPECT_EQ(capture.messages().back(), "setAutoDSTEnabled: exit");
    EXPECT_EQ(capture.messages(3000), capture.messages());
    EXPECT_TRUE(capture.everyLineTwice());
}

HOST_TEST(HardwareClockMode, OverwritesAnOldCopy) {
    makeCopyTool(host);
    host.file(kClock, "HWCLOCK=\"x\"\n");
    host.file(kCopy, "HWCLOCK=\"old\"\nOLD=1\n");
    EXPECT_TRUE(IC::setAutoDSTEnabled(true));
    EXPECT_EQ(host.read(kClock), "HWCLOCK=\"-u\"\n");
}

HOST_TEST(HardwareClockMode, DoesNotCreateAMissingFile) {
    host.directory("/etc/sysconfig");
    host.tool(kCopyCommand, "", 1);
    EXPECT_FALSE(IC::setAutoDSTEnabled(true));
    EXPECT_THAT(host.listDirectory("/etc/sysconfig"), IsEmpty());
}

HOST_TEST(HardwareClockMode, DoesNotAskWhetherTheCopyWasMade) {
    host.tool(kCopyCommand, "", 1);
    host.file(kClock, "HWCLOCK=\"x\"\nOTHER=1\n");
    EXPECT_FALSE(IC::setAutoDSTEnabled(true)) << "no copy";
    EXPECT_EQ(host.read(kClock), "HWCLOCK=\"x\"\nOTHER=1\n");
    host.file(kCopy, "HWCLOCK=\"old\"\n");
    EXPECT_TRUE(IC::setAutoDSTEnabled(true)) << "a copy that was left behind";
    EXPECT_EQ(host.read(kClock), "HWCLOCK=\"-u\"\n");
    EXPECT_FALSE(host.exists(kCopy));
    host.remove(kClock);
    host.file(kCopy, "HWCLOCK=\"old\"\n");
    EXPECT_TRUE(IC::setAutoDSTEnabled(false)) << "and no clock file";
    EXPECT_EQ(host.read(kClock), "HWCLOCK=\"--localtime\"\n");
}

HOST_TEST(HardwareClockMode, StaysAsItWasWhenTheDiskHasNoRoomForItsCopy) {
    makeCopyTool(host);
    const std::string before = fillDisk(host, "HWCLOCK=\"x\"");
    EXPECT_FALSE(IC::setAutoDSTEnabled(true));
    EXPECT_EQ(host.read(kClock), before);
    EXPECT_FALSE(host.exists(kCopy));
}

HOST_TEST(HardwareClockMode, LeavesTheFileOnAReadOnlyFileSystem) {
    host.tool(kCopyCommand, "", 1);
    host.file(kClock, "HWCLOCK=\"x\"\n");
    host.readOnly("/etc/sysconfig");
    EXPECT_FALSE(IC::setAutoDSTEnabled(true));
    EXPECT_EQ(host.read(kClock), "HWCLOCK=\"x\"\n");
}

HOST_TEST(HardwareClockMode, KeepsTheFileWholeOnAFullDisk) {
    ToolAnswer copy;
    copy.action = "cat \"$1\" > \"$2\"";
    copy.status = 1;
    host.tool(kCopyCommand, copy);
    host.file(kClock, "# comment\nHWCLOCK=\"x\"\n");
    host.fullDisk("/etc/sysconfig");
    EXPECT_FALSE(IC::setAutoDSTEnabled(true));
    EXPECT_EQ(host.read(kClock), "# comment\nHWCLOCK=\"x\"\n");
    EXPECT_FALSE(host.exists(kCopy));
}

}  // namespace
