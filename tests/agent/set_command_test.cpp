// set, by running the program.
#include <gmock/gmock.h>

#include <nlohmann/json.hpp>

#include "tests/agent/cvagent_run.h"
#include "tests/agent/terminal.h"

namespace {

using testing::EndsWith;
using testing::HasSubstr;
using testing::IsEmpty;
using testing::Not;
using Json = nlohmann::ordered_json;

const std::string kUntouched = "initialize 1 1 2\nunload\n";

HOST_TEST(SetCommand, WritesAndReadsBack) {
    CvagentRun cvagent(host);
    const Finished run = cvagent({"set", "computer", "OwnerContact", "room 6"});
    EXPECT_EQ(run.status, 0);
    EXPECT_THAT(run.out, EndsWith("    old  (empty)\n    new  room 6\n"));
    EXPECT_THAT(run.err, IsEmpty());
}

HOST_TEST(SetCommand, AnErrorOfThePluginIsShownAndEndsWithStatusOne) {
    CvagentRun cvagent(host);
    const Finished run = cvagent({"set", "computer", "OwnerContact", "room 5"});
    EXPECT_EQ(run.status, 1);
    EXPECT_EQ(run.out,
              "/oshw/root/computer\n"
              "  OwnerContact\n"
              "    old  (empty)\n"
              "    new  room 5\n");
    EXPECT_EQ(run.err, "cvagent: the plug-in reports: the disk is nearly full [fake]\n");
    EXPECT_EQ(cvagent.diary(), "initialize 1 1 2\n115=room 5\nunload\n");
}

HOST_TEST(SetCommand, AFailedWriteEndsWithStatusOne) {
    const Finished run = CvagentRun(host)({"set", "computer", "116", "somebody"});
    EXPECT_EQ(run.status, 1);
    EXPECT_THAT(run.out, IsEmpty());
    EXPECT_EQ(run.err, "cvagent: OwnerName was not changed: the disk is full\n");
}

HOST_TEST(SetCommand, WhatThePluginThrowsIsAFailedWrite) {
    CvagentRun cvagent(host);
    const Finished thrown = cvagent({"set", "computer", "OwnerContact", "throw"});
    EXPECT_EQ(thrown.status, 1);
    EXPECT_EQ(thrown.err, "cvagent: OwnerContact was not changed: the plug-in threw: thrown while writing\n");
    const Finished other = cvagent({"set", "computer", "OwnerContact", "seven"});
    EXPECT_EQ(other.status, 1);
    EXPECT_EQ(other.err, "cvagent: OwnerContact was not changed: the plug-in threw an unknown exception\n");
    EXPECT_THAT(cvagent.diary(), EndsWith("115=seven\nunload\n"));
}

HOST_TEST(SetCommand, ALongListThatIsRefusedIsCutShortInTheMessage) {
    std::vector<std::string> words = {"set", "ip-config:eth0", "DNSServers"};
    words.resize(40, "dns.example.com");
    const Finished run = CvagentRun(host)(words);
    EXPECT_EQ(run.status, 4);
    EXPECT_THAT(run.err, HasSubstr("'dns.example.com' 'dns.example.com' and more"));
    EXPECT_LT(run.err.size(), 500U);
}

HOST_TEST(SetCommand, TakesListsAsSeveralWords) {
    CvagentRun cvagent(host);
    const Finished run = cvagent({"set", "ip-config:eth0", "DNSServers", "192.0.2.1", "2001:db8::1"});
    EXPECT_EQ(run.status, 0);
    EXPECT_THAT(run.out, HasSubstr("old  192.0.2.53\n    new  192.0.2.1, 2001:db8::1\n"));
    EXPECT_EQ(cvagent({"set", "ip-config:eth0", "DNSServers", ""}).status, 0);
}

HOST_TEST(SetCommand, ValuesAreTakenAsTheyStand) {
    CvagentRun cvagent(host);
    for (const std::string value : {"[a,b]", "a,b", "-5", "tree", "--", "+", "a=b", "%%", "{}"}) {
        EXPECT_EQ(cvagent({"set", "computer", "OwnerContact", "--", value}).status, 0) << value;
        EXPECT_THAT(cvagent.diary(), EndsWith("\n115=" + value + "\nunload\n"));
    }
    EXPECT_EQ(cvagent({"set", "computer", "TimeZoneOffset", "-60"}).status, 0);
    EXPECT_THAT(cvagent.diary(), EndsWith("\n127=-60\nunload\n"));
}

HOST_TEST(SetCommand, OptionsMayStandAnywhere) {
    CvagentRun cvagent(host);
    for (const std::vector<std::string>& words : std::vector<std::vector<std::string>>{
             {"--json", "set", "computer", "115", "x"},
             {"set", "--json", "computer", "115", "x"},
             {"set", "computer", "115", "x", "--json"},
             {"set", "computer", "115", "x", "--json", "--log-level", "7000"}}) {
        const Finished run = cvagent(words);
        ASSERT_EQ(run.status, 0) << run.err;
        EXPECT_EQ(Json::parse(run.out)["property"]["new"]["value"], "x");
    }
}

HOST_TEST(SetCommand, PrintsOldAndNewAsJson) {
    const Finished run = CvagentRun(host)({"set", "ip-config:eth0", "IPOrigin", "dhcp", "--json"});
    ASSERT_EQ(run.status, 0) << run.err;
    EXPECT_EQ(
        Json::parse(run.out).dump(),
        R"({"id":10,"path":"/oshw/root/computer/chassis/network-controller/network-port:eth0/ip-config:eth0",)"
        R"("property":{"id":24,"name":"IPOrigin","old":{"name":"IPOrigin","kind":"enum","value":3},)"
        R"("new":{"name":"IPOrigin","kind":"enum","value":1}}})");
}

HOST_TEST(SetCommand, WritesWhatCannotBeRead) {
    CvagentRun cvagent(host);
    const Finished run = cvagent({"set", "ip-config:eth0", "EnumeratePorts", "1"});
    EXPECT_EQ(run.status, 0);
    EXPECT_THAT(run.out, HasSubstr("EnumeratePorts\n    done\n"));
    EXPECT_THAT(cvagent.diary(), HasSubstr("74=1\n"));
    const Finished asJson = cvagent({"set", "ip-config:eth0", "EnumeratePorts", "1", "--json"});
    EXPECT_EQ(asJson.status, 0);
    const std::string nothing = R"({"name":"EnumeratePorts","kind":"number","value":null})";
    EXPECT_EQ(Json::parse(asJson.out)["property"]["old"].dump(), nothing);
    EXPECT_EQ(Json::parse(asJson.out)["property"]["new"].dump(), nothing);
}

HOST_TEST(SetCommand, RefusedValuesNeverReachThePlugin) {
    CvagentRun cvagent(host);
    const std::vector<std::string> hostile = {
        "`reboot`", "$(reboot)", "1;reboot", "1\nreboot",           "'",
        "\"",       " 1",        "\u0661",   std::string(512, '1'), std::string(100000, 'a'),
        ""};
    for (const std::string& value : hostile) {
        for (const std::string property : {"IPv4Address", "HostName", "InterfaceState"}) {
            const Finished run = cvagent({"set", "ip-config:eth0", property, value});
            EXPECT_EQ(run.status, 4) << property << " " << value.substr(0, 20);
            EXPECT_THAT(run.err, HasSubstr("accepted: ")) << property;
            EXPECT_LT(run.err.size(), 500U);
        }
    }
    EXPECT_THAT(cvagent.diary(), Not(HasSubstr("=")));
}

HOST_TEST(SetCommand, SaysWhatIsAccepted) {
    const Finished run = CvagentRun(host)({"set", "computer", "TimeZoneOffset", "345"});
    EXPECT_EQ(run.status, 4);
    EXPECT_THAT(run.err, HasSubstr("'345' is not accepted for TimeZoneOffset"));
    EXPECT_THAT(run.err, HasSubstr("-660, -600,"));
    EXPECT_THAT(run.err, HasSubstr(" 660, 720"));
}

HOST_TEST(SetCommand, WhatCannotBeWrittenIsRefused) {
    CvagentRun cvagent(host);
    EXPECT_EQ(cvagent({"set", "computer", "HostName", "x"}).status, 4);
    EXPECT_EQ(cvagent({"set", "network-port:eth0", "LinkState", "1"}).status, 4);
    EXPECT_EQ(cvagent({"set", "computer", "900", "x"}).status, 3);
    EXPECT_EQ(cvagent({"set", "computer", "NoSuch", "x"}).status, 3);
    EXPECT_EQ(cvagent({"set", "nowhere", "HostName", "x"}).status, 3);
    EXPECT_THAT(cvagent.diary(), Not(HasSubstr("=")));
}

HOST_TEST(SetCommand, PowerActionsNeedAYes) {
    CvagentRun cvagent(host);
    for (const std::string action : {"9", "12", "restart", "halt"}) {
        const Finished run = cvagent({"set", "computer", "PowerAction", action});
        EXPECT_EQ(run.status, 2);
        EXPECT_THAT(run.err, HasSubstr("--yes"));
    }
    EXPECT_THAT(cvagent.diary(), Not(HasSubstr("=")));
    EXPECT_EQ(cvagent({"set", "computer", "PowerAction", "1"}).status, 0);
    EXPECT_EQ(cvagent({"set", "computer", "PowerAction", "9", "--yes"}).status, 0);
    EXPECT_THAT(cvagent.diary(), HasSubstr("123=9\n"));
    EXPECT_EQ(cvagent({"set", "computer", "PowerAction", "--yes", "12"}).status, 0);
    EXPECT_THAT(cvagent.diary(), HasSubstr("123=12\n"));
}

/// The fake plug-in restarts nothing.
class PowerQuestion : public HostFixture {
protected:
    OnTerminal ask(const std::string& answer) {
        return runOnTerminal({CVAGENT_PROGRAM, "--host-tools", "native", "--plugin", FAKE_PLUGIN_FILE, "set",
                              "computer", "PowerAction", "9"},
                             answer);
    }
};

HOST_TEST_F(PowerQuestion, IsAskedOnATerminal) {
    const OnTerminal yes = ask("y\n");
    EXPECT_EQ(yes.status, 0) << yes.output;
    EXPECT_THAT(yes.output, HasSubstr("This will restart the host at once. Go on? [y/N]"));
    EXPECT_THAT(yes.output, HasSubstr("9 (restart)"));
}

HOST_TEST_F(PowerQuestion, AnythingButYesMeansNo) {
    for (const std::string answer : {"\n", "n\n", "maybe\n", "\x04"}) {
        const OnTerminal no = ask(answer);
        EXPECT_EQ(no.status, 4) << no.output;
        EXPECT_THAT(no.output, HasSubstr("nothing was done"));
    }
}

HOST_TEST_F(PowerQuestion, ColourIsForTerminals) {
    const OnTerminal run =
        runOnTerminal({CVAGENT_PROGRAM, "--host-tools", "native", "--plugin", FAKE_PLUGIN_FILE, "tree"}, "");
    EXPECT_EQ(run.status, 0);
    EXPECT_THAT(run.output, HasSubstr("\x1b[1mcomputer\x1b[0m"));
}

}  // namespace
