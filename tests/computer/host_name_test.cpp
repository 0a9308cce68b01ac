// The cached names of the host, and the commands of a change of name.
#include "mi/host_name.h"

#include <gmock/gmock.h>

#include "mi/my_process.h"
#include "oshwmi/os_hw_mi.h"
#include "tests/computer/computer_host.h"
#include "tests/support/fake_host.h"
#include "tests/support/log_capture.h"
#include "tests/support/plugin_access.h"
#include "tests/support/texts_are.h"

namespace {

using testing::Contains;
using testing::IsEmpty;

class Names {
public:
    void update() { mi_.updateHostAndDomainName(); }
    const std::string& host() const { return IC::OsHwMITestAccess::hostName(mi_); }
    const std::string& domain() const { return IC::OsHwMITestAccess::domainName(mi_); }

private:
    IC::OsHwMI mi_;
};

HOST_TEST(CachedNames, AreTheFirstLinesAsTheyCame) {
    host.tool("hostname -s", "alpha\nsecond\n");
    host.tool("hostname -d", "example.org\n");
    Names names;
    LogCapture capture;
    names.update();
    EXPECT_EQ(names.host(), "alpha\n");
    EXPECT_EQ(names.domain(), "example.org\n");
    EXPECT_THAT(host.calls(), TextsAre("hostname -s", "hostname -d"));
    EXPECT_THAT(capture.messages(),
                TextsAre("updateHostAndDomainName: entry", "updateHostAndDomainName: exit"));
}

HOST_TEST(CachedNames, AreEmptyWhenNothingWasPrinted) {
    host.tool("hostname -s", "");
    host.tool("hostname -d", "", 1);
    Names names;
    names.update();
    EXPECT_EQ(names.host(), "");
    EXPECT_EQ(names.domain(), "");
}

HOST_TEST(CachedNames, KeepTheirContentWhenTheToolCannotTell) {
    host.toolInTurn("hostname -s", {{"alpha\n"}, {"hostname: Unknown host\n", 1}, {""}, {"beta\n"}});
    host.toolInTurn("hostname -d", {{"example.org\n"}, {"Unknown"}, {""}, {"Unknown\nexample.net\n"}});
    Names names;
    for (int time = 0; time < 3; ++time) {
        names.update();
        EXPECT_EQ(names.host(), "alpha\n");
        EXPECT_EQ(names.domain(), "example.org\n");
    }
    names.update();
    EXPECT_EQ(names.host(), "beta\n");
    EXPECT_EQ(names.domain(), "example.org\n");
    host.toolMissing("hostname");
    names.update();
    EXPECT_EQ(names.host(), "beta\n");
}

HOST_TEST(CachedNames, AreCutToABufferOf512Bytes) {
    host.tool("hostname -s", std::string(600, 'n') + "\n");
    host.tool("hostname -d", std::string(510, 'd') + "\n");
    Names names;
    names.update();
    EXPECT_EQ(names.host(), std::string(511, 'n'));
    EXPECT_EQ(names.domain(), std::string(510, 'd') + "\n");
}

HOST_TEST(CachedNames, AreTheFirstThingThatStartUpAsks) {
    host.tool("hostname %any", "alpha\n");
    host.expectUnrecorded();  // what the network's builders ask is not of interest here
    const LogCapture quiet;
    IC::myoshwmi.initialize(1, IC::Number(1U), IC::Number(2U));
    EXPECT_EQ(IC::OsHwMITestAccess::hostName(IC::myoshwmi), "alpha\n");
    const auto calls = host.calls();
    IC::myoshwmi.unload();
    ASSERT_GE(calls.size(), 3U);
    EXPECT_EQ(calls[0], "hostname -s");
    EXPECT_EQ(calls[1], "hostname -d");
    EXPECT_EQ(calls[2], "hostname");
}

HOST_TEST(NameChange, RunsOneCommandAndLogsItsInputs) {
    host.recordOnly("hostname");
    host.file(kHosts, "");
    LogCapture capture;
    IC::executeDomainandHostnameChanges("alpha", "example.org", true, "10.0.0.5");
    EXPECT_THAT(host.calls(), TextsAre("hostname alpha.example.org"));
    EXPECT_THAT(capture.messages(3000),
                TextsAre("executeDomainandHostnameChanges: entry", "HostName : alpha",
                         "DomainName : example.org", "Operation : 1", "IPAddress : 10.0.0.5",
                         "command: hostname alpha.example.org", "executeDomainandHostnameChanges: exit"));
    EXPECT_EQ(capture.messages().size(), 7U);
    EXPECT_TRUE(capture.everyLineTwice());
    EXPECT_EQ(IC::MyProcess::cnt, 0);
}

HOST_TEST(NameChange, OnlyLogsTheOperation) {
    host.recordOnly("hostname");
    for (const bool operation : {true, false}) {
        host.file(kHosts, "");
        LogCapture capture;
        IC::executeDomainandHostnameChanges("alpha", "example.org", operation, "");
        EXPECT_EQ(capture.messages()[3], operation ? "Operation : 1" : "Operation : 0");
        EXPECT_EQ(host.read(kHosts), "127.0.0.2\talpha.example.org\talpha\n");
    }
}

HOST_TEST(NameChange, WithoutADomainSetsTheBareNameAndWritesALoneDot) {
    host.recordOnly("hostname");
    host.file(kHosts, "");
    IC::executeDomainandHostnameChanges("alpha", "", true, "");
    EXPECT_THAT(host.calls(), TextsAre("hostname alpha"));
    EXPECT_EQ(host.read(kHosts), "127.0.0.2\talpha.\talpha\n");
    EXPECT_EQ(host.read(kHostName), "alpha.");
}

HOST_TEST(NameChange, CutsLineBreaks) {
    host.recordOnly("hostname");
    host.file(kHosts, "");
    IC::executeDomainandHostnameChanges("alpha\n\n", "example.org\n", true, "");
    EXPECT_THAT(host.calls(), TextsAre("hostname alpha.example.org"));
    EXPECT_EQ(host.read(kHosts), "127.0.0.2\talpha.example.org\talpha\n");
    EXPECT_EQ(host.read(kHostName), "alpha.example.org");
}

HOST_TEST(NameChange, StopsBeforeTheFilesWhenANameIsMoreThanAName) {
    host.recordOnly("hostname");
    host.recordOnly("reboot");
    host.file(kHosts, "");
    LogCapture capture;
    IC::executeDomainandHostnameChanges("alpha; reboot #", "example.org", true, "");
    IC::executeDomainandHostnameChanges("alpha", "`reboot`", true, "");
    EXPECT_THAT(host.calls(), IsEmpty());
    EXPECT_EQ(host.read(kHosts), "");
    EXPECT_EQ(capture.messages()[5],
              "Command refused for its text \"alpha; reboot #\" (the \";\"), not run: "
              "hostname alpha; reboot #.example.org");
    EXPECT_EQ(capture.messages(6000).back(), "Could not set HostName !!");
}

HOST_TEST(NameChange, TakesACommandOf511Bytes) {
    host.recordOnly("hostname");
    host.file(kHosts, "");
    const std::string name(511 - std::string("hostname .org").size(), 'n');
    IC::executeDomainandHostnameChanges(name, "org", true, "");
    EXPECT_THAT(host.calls(), TextsAre("hostname " + name + ".org"));
    EXPECT_EQ(host.read(kHostName), name + ".org");
}

HOST_TEST(NameChange, StopsBeforeTheFilesWhenTheCommandIsTooLong) {
    host.recordOnly("hostname");
    host.file(kHosts, "127.0.0.2 old\n");
    for (const std::size_t length : {std::size_t{512}, std::size_t{100000}}) {
        LogCapture capture;
        IC::executeDomainandHostnameChanges(std::string(length - std::string("hostname ").size(), 'n'), "",
                                            true, "");
        EXPECT_THAT(
            capture.messages(3000),
            Contains("command: hostname " + std::string(length - std::string("hostname ").size(), 'n')));
        EXPECT_EQ(capture.messages(6000).size(), 2U);
        EXPECT_EQ(capture.messages(6000).back(), "Could not set HostName !!");
        EXPECT_EQ(capture.messages().back(), "executeDomainandHostnameChanges: exit");
    }
    EXPECT_THAT(host.calls(), IsEmpty());
    EXPECT_EQ(host.read(kHosts), "127.0.0.2 old\n");
    EXPECT_FALSE(host.exists(kHostName));
}

HOST_TEST(NameChange, TellsTheCommandWithADomainThatMakesItTooLong) {
    LogCapture capture;
    const std::string domain(600, 'd');
    IC::executeDomainandHostnameChanges("alpha", domain, true, "");
    EXPECT_THAT(capture.messages(3000), Contains("command: hostname alpha." + domain));
}

HOST_TEST(NameChange, DoesNotAskWhetherTheCommandSucceeded) {
    host.tool("hostname %any", "hostname: you must be root\n", 1);
    host.file(kHosts, "");
    IC::executeDomainandHostnameChanges("alpha", "example.org", true, "");
    EXPECT_EQ(host.read(kHostName), "alpha.example.org");
}

}  // namespace
