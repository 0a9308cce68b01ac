// Every property of the computer through cvagent and the plug-in as they are installed.
#include <gmock/gmock.h>

#include <cstdlib>
#include <filesystem>

#include "tests/computer/computer_host.h"
#include "tests/support/fake_host.h"
#include "tests/support/texts_are.h"

namespace {

using testing::HasSubstr;
using testing::IsEmpty;

constexpr char kClockText[] = "# the clock\nHWCLOCK=\"-u\"\nTIMEZONE=\"CET\"\n\nDEFAULT_TIMEZONE=\"x\"";
constexpr char kHostsText[] = "127.0.0.1\tlocalhost\n127.0.0.2\talpha.example.org alpha\n";

class ComputerThroughAgent : public HostFixture {
protected:
    void setUpHost(FakeHost& host) override {
        setenv("TZ", "XXX+3:30", 1);
        host.setHostName("alpha");
        host.tool("hostname", "alpha\n");
        host.tool("hostname -s", "alpha\n");
        host.tool("hostname -d", "example.org\n");
        host.file(kAssetFile, "Computer.OwnerContact=roe@example.org\nOther.Key=kept\n");
        host.file(kClock, kClockText);
        host.file(kHosts, kHostsText);
    }

    static Finished agent(FakeHost& host, std::vector<std::string> words) {
        host.clearCalls();
        words.insert(words.begin(), {CVAGENT_PROGRAM, "--host-tools", "native", "--plugin", CORVISTA_PLUGIN});
        return host.run(words);
    }
    static std::string get(FakeHost& host, const char* property) {
        const Finished run = agent(host, {"get", "computer", property});
        EXPECT_EQ(run.status, 0) << run.err;
        return run.out;
    }
    /// Start-up asks for the names; this is what else was run.
    static std::vector<std::string> furtherCalls(const FakeHost& host) {
        std::vector<std::string> calls = host.calls();
        EXPECT_GE(calls.size(), 3U);
        EXPECT_THAT(std::vector(calls.begin(), calls.begin() + 3),
                    TextsAre("hostname -s", "hostname -d", "hostname"));
        return {calls.begin() + 3, calls.end()};
    }
    static void expectOtherFilesUntouched(const FakeHost& host, const std::string& changed = "") {
        if (changed != kClock) {
            EXPECT_EQ(host.read(kClock), kClockText);
            EXPECT_FALSE(host.exists("/etc/localtime"));
        }
        if (changed != kAssetFile) {
            EXPECT_EQ(host.read(kAssetFile), "Computer.OwnerContact=roe@example.org\nOther.Key=kept\n");
        }
        EXPECT_EQ(host.read(kHosts), kHostsText);
        EXPECT_FALSE(host.exists("/etc/HOSTNAME"));
    }
};

HOST_TEST_F(ComputerThroughAgent, IsReadWithoutChangingTheHost) {
    EXPECT_THAT(get(host, "HostName"), HasSubstr("alpha"));
    EXPECT_THAT(get(host, "OwnerContact"), HasSubstr("roe@example.org"));
    EXPECT_THAT(get(host, "OwnerName"), HasSubstr("(empty)"));
    EXPECT_THAT(get(host, "PowerAction"), HasSubstr("on"));
    EXPECT_THAT(get(host, "PowerActions"), HasSubstr("12"));
    EXPECT_THAT(get(host, "TimeZoneOffset"), HasSubstr("-210"));
    EXPECT_THAT(get(host, "ComputerConstant200"), HasSubstr("1"));
    EXPECT_THAT(get(host, "CurrentTime"), HasSubstr("CurrentTime"));
    EXPECT_THAT(furtherCalls(host), IsEmpty());
    EXPECT_THAT(host.clockCalls(), IsEmpty());
    expectOtherFilesUntouched(host);
}

HOST_TEST_F(ComputerThroughAgent, TakesItsOwner) {
    EXPECT_EQ(agent(host, {"set", "computer", "OwnerName", "J\xc3\xbcrgen; $(halt)"}).status, 0);
    EXPECT_THAT(furtherCalls(host), IsEmpty());
    EXPECT_EQ(agent(host, {"set", "computer", "OwnerContact", ""}).status, 0);
    EXPECT_EQ(host.read(kAssetFile),
              "Computer.OwnerContact=\nComputer.OwnerName=J\xc3\xbcrgen; $(halt)\nOther.Key=kept\n");
    EXPECT_THAT(get(host, "OwnerName"), HasSubstr("J\xc3\xbcrgen; $(halt)"));
    expectOtherFilesUntouched(host, kAssetFile);
}

HOST_TEST_F(ComputerThroughAgent, SwitchesItsZone) {
    host.file("/etc/localtime", "old");
    EXPECT_EQ(agent(host, {"set", "computer", "TimeZoneOffset", "-210"}).status, 0);
    EXPECT_EQ(std::filesystem::read_symlink("/etc/localtime"), "/usr/share/zoneinfo/America/St_Johns");
    EXPECT_EQ(host.read("/etc/localtime.bak"), "old");
    EXPECT_EQ(host.read(kClock),
              "# the clock\nHWCLOCK=\"-u\"\nTIMEZONE=\"America/St_Johns\"\n\nDEFAULT_TIMEZONE=\"x\"\n");
    EXPECT_FALSE(host.exists("/etc/sysconfig/clock.bak"));
    EXPECT_THAT(furtherCalls(host), IsEmpty());
    expectOtherFilesUntouched(host, kClock);
}

HOST_TEST_F(ComputerThroughAgent, RefusesAnOffsetWithoutAZone) {
    const Finished run = agent(host, {"set", "computer", "TimeZoneOffset", "345"});
    EXPECT_EQ(run.status, 4);
    EXPECT_THAT(run.err, testing::AllOf(HasSubstr("-660"), HasSubstr("330"), HasSubstr("720")));
    EXPECT_THAT(furtherCalls(host), IsEmpty());
    expectOtherFilesUntouched(host);
}

HOST_TEST_F(ComputerThroughAgent, SetsItsClock) {
    EXPECT_EQ(agent(host, {"set", "computer", "CurrentTime", "2001-09-09T01:46:40Z", "--force"}).status, 0);
    ASSERT_EQ(host.clockCalls().size(), 1U);
    EXPECT_EQ(host.clockCalls()[0].function, "settimeofday");
    EXPECT_EQ(host.clockCalls()[0].seconds, 1000000000);
    EXPECT_FALSE(host.clockCalls()[0].timeZone);
    EXPECT_THAT(furtherCalls(host), IsEmpty());
    expectOtherFilesUntouched(host);
}

HOST_TEST_F(ComputerThroughAgent, SaysHonestlyWhichYearItsHostCannotHold) {
    const Finished run = agent(host, {"set", "computer", "CurrentTime", "2040-01-01T00:00:00Z", "--force"});
    if (sizeof(long) == 4) {
        EXPECT_EQ(run.status, 4);
        EXPECT_THAT(run.err, HasSubstr("CurrentTime"));
        EXPECT_THAT(host.clockCalls(), IsEmpty());
        return;
    }
    EXPECT_EQ(run.status, 0) << run.err;
    ASSERT_EQ(host.clockCalls().size(), 1U);
    EXPECT_EQ(host.clockCalls()[0].seconds, 2208988800LL);
}

HOST_TEST_F(ComputerThroughAgent, SaysWhenItsClockCannotBeSet) {
    host.clockFails(EPERM);
    const Finished run = agent(host, {"set", "computer", "CurrentTime", "2001-09-09T01:46:40Z", "--force"});
    EXPECT_EQ(run.status, 1);
    EXPECT_THAT(run.err, HasSubstr("CurrentTime"));
}

HOST_TEST_F(ComputerThroughAgent, RestartsAndHaltsWhenTheUserIsSure) {
    EXPECT_EQ(agent(host, {"set", "--yes", "computer", "PowerAction", "9"}).status, 0);
    EXPECT_THAT(furtherCalls(host), TextsAre("shutdown -r now"));
    EXPECT_EQ(agent(host, {"set", "--yes", "computer", "PowerAction", "12"}).status, 0);
    EXPECT_THAT(furtherCalls(host), TextsAre("shutdown -h now"));
    EXPECT_EQ(agent(host, {"set", "computer", "PowerAction", "1"}).status, 0);
    EXPECT_THAT(furtherCalls(host), IsEmpty());
    EXPECT_NE(agent(host, {"set", "computer", "PowerAction", "9"}).status, 0);
    EXPECT_THAT(furtherCalls(host), IsEmpty());
    expectOtherFilesUntouched(host);
}

HOST_TEST_F(ComputerThroughAgent, DoesNotTakeAHostName) {
    EXPECT_EQ(agent(host, {"set", "computer", "HostName", "beta"}).status, 4);
    EXPECT_THAT(furtherCalls(host), IsEmpty());
    expectOtherFilesUntouched(host);
}

}  // namespace
