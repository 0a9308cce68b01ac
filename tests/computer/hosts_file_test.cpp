// /etc/hosts and /etc/HOSTNAME as a change of name leaves them.
#include <gmock/gmock.h>
#include <sys/mount.h>

#include "mi/host_name.h"
#include "tests/computer/computer_host.h"
#include "tests/computer/computer_tools.h"
#include "tests/support/fake_host.h"
#include "tests/support/log_capture.h"
#include "tests/support/texts_are.h"

namespace {

using testing::IsEmpty;

class HostsFile : public HostFixture {
protected:
    void setUpHost(FakeHost& host) override { host.recordOnly("hostname"); }

    static void change(const std::string& address = "") {
        IC::executeDomainandHostnameChanges("alpha", "example.org", true, address);
    }
};

constexpr char kEntry[] = "127.0.0.2\talpha.example.org\talpha\n";

HOST_TEST_F(HostsFile, HoldsOneEntryForTheHostAtTheEnd) {
    host.file(kHosts,
              "127.0.0.2 old.example.org old\n127.0.0.1\tlocalhost\n  127.0.0.2 second\n::1 localhost\n");
    change();
    EXPECT_EQ(host.read(kHosts), std::string("127.0.0.1\tlocalhost\n::1 localhost\n") + kEntry);
    EXPECT_EQ(host.read(kHostName), "alpha.example.org");
    EXPECT_THAT(host.calls(), TextsAre("hostname alpha.example.org"));
}

HOST_TEST_F(HostsFile, GivesUpTheLinesOfTheAddressAndOfTheLoopback) {
    host.file(kHosts, "10.0.0.5 old\n127.0.0.2 older\n10.0.0.50 neighbour\n110.0.0.5 far\n10.0.0.6 stays\n");
    change("10.0.0.5");
    EXPECT_EQ(host.read(kHosts), "10.0.0.6 stays\n10.0.0.5\talpha.example.org\talpha\n");
}

HOST_TEST_F(HostsFile, GivesUpACommentThatMentionsTheAddress) {
    host.file(kHosts, "# 127.0.0.2 is ours\n# comment\nx127.0.0.2y\n");
    change();
    EXPECT_EQ(host.read(kHosts), std::string("# comment\n") + kEntry);
}

HOST_TEST_F(HostsFile, KeepsEveryOtherLineByteForByte) {
    const std::string contents[] = {
        "# comment\n\n\t10.0.0.1   b  a # tail\nunknown words\n",
        "10.0.0.1 dos\r\n\r\n",
        std::string("10.0.0.1 \xff\0\x01\n", 13),
        lineOf(511, "10.0.0.1 ") + "\n" + lineOf(512, "10.0.0.1 ") + "\n" + lineOf(513, "10.0.0.1 ") + "\n" +
            lineOf(5000, "10.0.0.1 ") + "\n",
        "",
    };
    for (const std::string& content : contents) {
        host.file(kHosts, content);
        change();
        EXPECT_EQ(host.read(kHosts), content + kEntry);
    }
}

HOST_TEST_F(HostsFile, EndsALastLineBeforeTheEntry) {
    host.file(kHosts, "10.0.0.1 last");
    change();
    EXPECT_EQ(host.read(kHosts), std::string("10.0.0.1 last\n") + kEntry);
    host.file(kHosts, "10.0.0.1 last\n127.0.0.2 old");
    change();
    EXPECT_EQ(host.read(kHosts), std::string("10.0.0.1 last\n") + kEntry);
}

HOST_TEST_F(HostsFile, GivesUpALineOfAnyLength) {
    const std::string atItsEnd = lineOf(5000, "10.0.0.1 ") + " # once 127.0.0.2\n";
    host.file(kHosts, lineOf(513, "127.0.0.2 ") + "\n" + atItsEnd + lineOf(513, "10.0.0.1 ") + "\n");
    change();
    EXPECT_EQ(host.read(kHosts), lineOf(513, "10.0.0.1 ") + "\n" + kEntry);
}

HOST_TEST_F(HostsFile, WithADirectoryInItsPlaceCannotBeOpenedForWriting) {
    host.directory(kHosts);
    LogCapture capture;
    change();
    EXPECT_THAT(capture.messages(6000), TextsAre("Can not open '/etc/hosts' in write mode."));
    EXPECT_FALSE(host.exists(kHostName));
}

HOST_TEST_F(HostsFile, IsTheSameAfterTheSameChange) {
    host.file(kHosts, "10.0.0.1 a\n");
    change();
    const auto once = host.read(kHosts);
    change();
    EXPECT_EQ(host.read(kHosts), once);
}

HOST_TEST_F(HostsFile, StopsTheChangeWhenItIsMissing) {
    LogCapture capture;
    change();
    EXPECT_THAT(capture.messages(6000), TextsAre("Can not open '/etc/hosts' in Read mode."));
    EXPECT_THAT(host.calls(), TextsAre("hostname alpha.example.org"));
    EXPECT_FALSE(host.exists(kHosts));
    EXPECT_FALSE(host.exists(kHostName));
    EXPECT_EQ(capture.messages().back(), "executeDomainandHostnameChanges: exit");
}

/// Both files stay as they are where /etc takes no write.
void expectUnchanged(FakeHost& host, void (FakeHost::*spoil)(const std::string&), void (*change)()) {
    host.file(kHosts, "10.0.0.1 a\n127.0.0.2 old\n");
    host.file(kHostName, "old");
    (host.*spoil)("/etc");
    LogCapture capture;
    change();
    EXPECT_THAT(capture.messages(6000), TextsAre("Can not open '/etc/hosts' in write mode."));
    EXPECT_EQ(host.read(kHosts), "10.0.0.1 a\n127.0.0.2 old\n");
    EXPECT_EQ(host.read(kHostName), "old");
}

HOST_TEST_F(HostsFile, StopsTheChangeOnAReadOnlyFileSystem) {
    expectUnchanged(host, &FakeHost::readOnly, [] { change(); });
}

HOST_TEST_F(HostsFile, StaysWholeOnAFullDisk) {
    expectUnchanged(host, &FakeHost::fullDisk, [] { change(); });
}

HOST_TEST_F(HostsFile, StaysWholeWhenTheDiskHasNoRoomForALongerOne) {
    constexpr char kDisk[] = "/etc/disk";
    host.directory(kDisk);
    ASSERT_EQ(mount("small", kDisk, "tmpfs", 0, "size=16k"), 0);
    host.file("/etc/disk/hosts", "10.0.0.1 a\n127.0.0.2 old\n");
    host.symlink(kHosts, "/etc/disk/hosts");
    LogCapture capture;
    change(std::string(20000, '1'));
    EXPECT_THAT(capture.messages(6000), TextsAre("Could not write all of '/etc/hosts'."));
    EXPECT_EQ(host.read(kHosts), "10.0.0.1 a\n127.0.0.2 old\n");
    change("10.0.0.5");
    EXPECT_EQ(host.read("/etc/disk/hosts"), "10.0.0.1 a\n10.0.0.5\talpha.example.org\talpha\n");
}

HOST_TEST_F(HostsFile, IsChangedAlsoWhenTheNameFileCannotBeWritten) {
    host.file(kHosts, "");
    host.directory(kHostName);
    LogCapture capture;
    change();
    EXPECT_EQ(host.read(kHosts), kEntry);
    EXPECT_THAT(capture.messages(6000), IsEmpty());
}

HOST_TEST_F(HostsFile, GoesWithANameFileThatIsWrittenAnew) {
    host.file(kHosts, "");
    host.file(kHostName, "a much longer name than the new one.example.org\nand a second line\n");
    change();
    EXPECT_EQ(host.read(kHostName), "alpha.example.org");
}

}  // namespace
