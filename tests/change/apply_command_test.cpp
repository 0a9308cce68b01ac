// apply, diff, export, plan and set by running the program: on a host of scripted tools, and on links of a
// real kernel.
#include <gmock/gmock.h>

#include <nlohmann/json.hpp>

#include "tests/agent/cvagent_run.h"
#include "tests/agent/linked_host.h"
#include "tests/agent/suse_host.h"

namespace {

using testing::AllOf;
using testing::ElementsAre;
using testing::HasSubstr;
using testing::IsEmpty;
using testing::Not;
using testing::StartsWith;
using Json = nlohmann::ordered_json;

const std::string kUntouched = "initialize 1 1 2\nunload\n";

std::string changeOf(const std::string& node, const std::string& property, const Json& value) {
    return Json{{"node", node}, {"property", property}, {"value", value}}.dump();
}

HOST_TEST(ApplyCommand, MakesWhatIsNotSoAlready) {
    host.file("/root/changes",
              "[" + changeOf("computer", "OwnerContact", "room 6") + "," +
                  changeOf("ip-config:eth0", "DNSServers", Json{"192.0.2.1", "2001:db8::1"}) + "]");
    CvagentRun cvagent(host);
    const Finished first = cvagent({"apply", "/root/changes", "--verify-within", "0"});
    EXPECT_EQ(first.status, 0) << first.err;
    EXPECT_THAT(first.out, HasSubstr("applied    /oshw/root/computer OwnerContact  room 6\n"));
    EXPECT_THAT(cvagent.diary(), HasSubstr("115=room 6\n"));
    EXPECT_LT(cvagent.diary().find("94="), cvagent.diary().find("115=")) << "the interface comes first";
}

HOST_TEST(ApplyCommand, ChangesNothingASecondTime) {
    SuseHost suse(host);
    suse.follows("hostname -s", "linux\n", "hostname earth.example.com", "earth\n");
    host.file("/root/changes", "[" + changeOf("ip-config:eth0", "HostName", "earth") + "," +
                                   changeOf("ip-config:eth0", "IPOrigin", "static") + "]");
    const Finished first = suse.run({"apply", "/root/changes", "--verify-within", "0"});
    EXPECT_EQ(first.status, 0) << first.out << first.err;
    EXPECT_THAT(first.out, HasSubstr("applied    "));
    EXPECT_THAT(suse.changes(), testing::Contains("hostname earth.example.com"));
    const std::string hosts = suse.read("/etc/hosts");
    const Finished second = suse.run({"apply", "/root/changes"});
    EXPECT_EQ(second.status, 0) << second.out << second.err;
    EXPECT_THAT(second.out, Not(HasSubstr("applied")));
    EXPECT_THAT(second.out, HasSubstr("unchanged  "));
    EXPECT_THAT(suse.changes(), IsEmpty());
    EXPECT_EQ(suse.read("/etc/hosts"), hosts);
}

HOST_TEST(ApplyCommand, TellsWhatBecameOfEachAsJson) {
    host.file("/root/changes", "[" + changeOf("computer", "OwnerContact", "room 6") + "," +
                                   changeOf("computer", "OwnerName", "bob") + "]");
    const Finished run =
        CvagentRun(host)({"apply", "/root/changes", "--json", "--force", "--verify-within", "0"});
    EXPECT_EQ(run.status, 1);
    const Json changes = Json::parse(run.out)["changes"];
    ASSERT_EQ(changes.size(), 2U);
    EXPECT_EQ(changes[0]["verdict"], "applied");
    EXPECT_EQ(changes[0]["property"].dump(), R"({"id":115,"name":"OwnerContact"})");
    EXPECT_EQ(changes[0]["before"], "");
    EXPECT_EQ(changes[0]["after"], "room 6");
    EXPECT_EQ(changes[1]["verdict"], "failed");
    EXPECT_THAT(changes[1]["reason"].get<std::string>(), HasSubstr("the disk is full"));
}

HOST_TEST(ApplyCommand, StopsAtTheFirstThatFails) {
    host.file("/root/changes", "[" + changeOf("computer", "OwnerName", "bob") + "," +
                                   changeOf("computer", "TimeZoneOffset", -60) + "]");
    CvagentRun cvagent(host);
    const Finished run = cvagent({"apply", "/root/changes", "--force", "--verify-within", "0"});
    EXPECT_EQ(run.status, 1);
    EXPECT_THAT(run.out, HasSubstr("failed     /oshw/root/computer OwnerName"));
    EXPECT_THAT(run.out, HasSubstr("not made   /oshw/root/computer TimeZoneOffset\n"));
    EXPECT_THAT(cvagent.diary(), Not(HasSubstr("127=")));
}

HOST_TEST(ApplyCommand, DoesNothingOfWhatFailsWhenItIsTriedOut) {
    host.file("/root/changes", "[" + changeOf("computer", "OwnerContact", "x") + "," +
                                   changeOf("computer", "OwnerName", "bob") + "]");
    CvagentRun cvagent(host);
    const Finished run = cvagent({"apply", "/root/changes"});
    EXPECT_EQ(run.status, 1);
    EXPECT_THAT(run.err, HasSubstr("tried out, it fails: OwnerName was not changed: the disk is full"));
    EXPECT_EQ(cvagent.diary(), kUntouched);
}

HOST_TEST(ApplyCommand, JudgesAllOfAFileBeforeAnythingIsDone) {
    const std::string good = changeOf("computer", "OwnerContact", "x");
    for (const auto& [content, status, message] : std::vector<std::tuple<std::string, int, std::string>>{
             {"[" + good + "," + changeOf("nowhere", "OwnerContact", "x") + "]", 3, "changes[1]: "},
             {"[" + good + "," + changeOf("computer", "NoSuch", "x") + "]", 3, "changes[1]: "},
             {"[" + good + "," + changeOf("computer", "HostName", "x") + "]", 4, "cannot be written"},
             {"[" + good + "," + changeOf("ip-config:eth0", "IPv4Address", "$(reboot)") + "]", 4,
              "changes[1]: '$(reboot)' is not accepted for IPv4Address"},
             {"[" + good + "," + good + "]", 2, "stands in the file twice"},
             {"[" + good, 2, "'/root/changes': parse error at line 1"},
             {"[" + good + "," + changeOf("computer", "PowerAction", 9) + "]", 2, "--yes"}}) {
        host.file("/root/changes", content);
        CvagentRun cvagent(host);
        const Finished run = cvagent({"apply", "/root/changes"});
        EXPECT_EQ(run.status, status) << content << run.err;
        EXPECT_THAT(run.err, HasSubstr(message));
        EXPECT_THAT(run.out, IsEmpty());
        EXPECT_THAT(cvagent.diary(), Not(HasSubstr("="))) << content;
    }
}

HOST_TEST(ApplyCommand, ReadsFilesAndStandardInputAndNothingThatHangs) {
    host.file("/root/changes", "[" + changeOf("computer", "OwnerContact", "in") + "]");
    CvagentRun cvagent(host);
    std::vector<std::string> words = cvagent.commandLine({"apply", "-", "--verify-within", "0"});
    std::vector<std::string> line = {"sh", "-c", "exec \"$@\" < /root/changes", "sh"};
    line.insert(line.end(), words.begin(), words.end());
    EXPECT_EQ(host.run(line).status, 0);
    EXPECT_THAT(cvagent.diary(), HasSubstr("115=in\n"));
    host.run({"mkfifo", "/root/pipe"});
    host.realTool("mkfifo");
    host.run({"mkfifo", "/root/pipe"});
    host.symlink("/root/loop", "loop");
    for (const char* file : {"/root/pipe", "/root", "/root/none", "/root/loop", "/dev/zero"}) {
        const Finished run = cvagent({"diff", file});
        EXPECT_EQ(run.status, 1) << file;
        EXPECT_THAT(run.err, HasSubstr("cannot be read")) << file;
    }
    // a name is meant from where the program was started
    std::vector<std::string> there = {"sh", "-c", "cd /root; exec \"$@\"", "sh"};
    words = cvagent.commandLine({"diff", "changes"});
    there.insert(there.end(), words.begin(), words.end());
    EXPECT_THAT(host.run(there).err, Not(HasSubstr("cannot be read")));
}

HOST_TEST(ExportCommand, WritesWhatDiffFindsSo) {
    SuseHost suse(host);
    const Finished exported = suse.run({"export"});
    ASSERT_EQ(exported.status, 0) << exported.err;
    std::set<std::string> names;
    const Json document = Json::parse(exported.out);
    for (const Json& change : document["changes"]) {
        names.insert(change["property"].get<std::string>());
    }
    EXPECT_EQ(names,
              (std::set<std::string>{"TimeZoneOffset", "IPOrigin", "IPv4Address", "SubnetMask", "DNSServers",
                                     "HostName", "DomainName", "DNSSuffixes", "IPv4Gateway"}));
    EXPECT_THAT(suse.changes(), IsEmpty());
    host.file("/root/changes", exported.out);
    const Finished same = suse.run({"diff", "/root/changes"});
    EXPECT_EQ(same.status, 0) << same.out << same.err;
    EXPECT_EQ(same.out, "");
    const Finished again = suse.run({"apply", "/root/changes"});
    EXPECT_EQ(again.status, 0) << again.out << again.err;
    EXPECT_THAT(suse.changes(), IsEmpty());
    host.file("/etc/resolv.conf", "nameserver 192.0.2.99\x1b\n");
    const Finished drift = suse.run({"diff", "/root/changes"});
    EXPECT_EQ(drift.status, 1);
    EXPECT_THAT(drift.out, HasSubstr("DNSServers\n    file  192.0.2.53\n    host  192.0.2.99"));
    EXPECT_THAT(drift.out, Not(HasSubstr("\x1b")));
    const Json json = Json::parse(suse.run({"diff", "/root/changes", "--json"}).out);
    EXPECT_EQ(json["differences"][0]["property"]["name"], "DNSServers");
    EXPECT_EQ(json["differences"][0]["verdict"], "differs");
}

HOST_TEST(ExportCommand, LeavesOutWhatALeaseGave) {
    SuseHost suse(host);
    host.file(SuseHost::kInterfaceFile, "BOOTPROTO=dhcp\nIPADDR=192.0.2.10\n");
    const Finished exported = suse.run({"export", "ip-config:eth0"});
    EXPECT_THAT(exported.out, HasSubstr("\"property\": \"IPOrigin\",\n      \"value\": \"1\""));
    EXPECT_THAT(exported.out, Not(HasSubstr("IPv4Address")));
    EXPECT_THAT(exported.out, Not(HasSubstr("OwnerName")));
}

HOST_TEST(PlanCommand, SaysWhyThereIsNone) {
    CvagentRun cvagent(host);
    EXPECT_EQ(cvagent({"plan", "computer", "OwnerContact"}).status, 2);
    EXPECT_EQ(cvagent({"plan", "computer", "OwnerContact", "\n"}).status, 4);
    EXPECT_EQ(cvagent({"plan", "nowhere", "OwnerContact", "x"}).status, 3);
    EXPECT_THAT(cvagent.diary(), Not(HasSubstr("=")));
}

HOST_TEST(TwoChanges, OneOfThemWaits) {
    CvagentRun first(host);
    first.telling("churn");
    RunningProgram watch = first.start({"watch", "--for", "1"});
    ASSERT_TRUE(watch.waitForOutput("published"));
    host.file("/root/changes", "[" + changeOf("computer", "OwnerContact", "late") + "]");
    CvagentRun cvagent(host);
    const Finished run = cvagent({"apply", "/root/changes", "--verify-within", "0"});
    EXPECT_EQ(run.status, 0) << run.err;
    EXPECT_THAT(cvagent.diary(), HasSubstr("115=late\n"));
}

/// cvagent with the real plug-in and our adapters on a kernel's links, each interface with its file.
class ChangesInForce : public LinkedHost {
protected:
    void setUpHost(FakeHost& host) override {
        LinkedHost::setUpHost(host);
        for (const std::string words :
             {"link add eth1 type veth peer name sw1", "link set eth1 addrgenmode none",
              "link set sw1 addrgenmode none", "link set eth1 up", "link set sw1 up",
              "address add 198.51.100.1/24 dev eth1"}) {
            ip(host, words);
        }
        ASSERT_TRUE(carrierComes("eth1") && carrierComes("sw1"));
    }
    static std::string moveFile() {
        return "[" + changeOf("ip-config:eth0", "IPv4Gateway", "203.0.113.1") + "," +
               changeOf("ip-config:eth0", "SubnetMask", "255.255.255.128") + "," +
               changeOf("ip-config:eth0", "IPv4Address", "203.0.113.7") + "]";
    }
    static std::string state(FakeHost& host) {
        return ip(host, "-o -4 address show dev eth0 | awk '{printf \"%s \", $4}'") +
               ip(host, "route show default | tr -d '\\n'");
    }
};

HOST_TEST_F(ChangesInForce, AddressMaskAndGatewayWorkTogether) {
    host.file("/root/changes", moveFile());
    const Finished run = cvagent(host, {"apply", "/root/changes", "--verify-within", "0.2"});
    EXPECT_EQ(run.status, 0) << run.out << run.err;
    EXPECT_THAT(state(host), HasSubstr("203.0.113.7/25 default via 203.0.113.1 dev eth0"));
    EXPECT_EQ(cvagent(host, {"diff", "/root/changes"}).status, 0);
    const Finished again = cvagent(host, {"apply", "/root/changes"});
    EXPECT_EQ(again.status, 0);
    EXPECT_THAT(again.out, Not(HasSubstr("applied")));
}

HOST_TEST_F(ChangesInForce, WhatSpeaksAgainstAChangeIsSaidBeforeAnythingIsDone) {
    const std::string before = state(host);
    const auto refuse = [&](const std::string& property, const std::string& value,
                            const std::string& reason) {
        const Finished run = cvagent(host, {"set", "ip-config:eth0", property, value});
        EXPECT_EQ(run.status, 4) << run.out;
        EXPECT_THAT(run.err, HasSubstr(reason));
        EXPECT_THAT(run.err, HasSubstr("Nothing was done; --force does it all the same"));
        EXPECT_EQ(state(host), before);
    };
    refuse("IPv4Address", "198.51.100.1", "198.51.100.1 is the address of eth1");
    refuse("IPv4Address", "192.0.2.255", "broadcast address");
    refuse("IPv4Gateway", "203.0.113.1", "in no subnet of this host");
    const std::string gateway = changeOf("ip-config:eth0", "IPv4Gateway", "203.0.113.1");
    for (const auto& [file, start] :
         {std::pair("[" + gateway + "]", "cvagent: /oshw/"),
          std::pair("[" + changeOf("computer", "115", "room 6") + "," + gateway + "]",
                    "cvagent: changes[1]: /oshw/")}) {
        host.file("/root/changes", file);
        const Finished apply = cvagent(host, {"apply", "/root/changes"});
        EXPECT_EQ(apply.status, 4);
        EXPECT_THAT(apply.err, AllOf(StartsWith(start), HasSubstr("203.0.113.1 is in no subnet")));
    }
    EXPECT_EQ(state(host), before);
    const Finished forced = cvagent(host, {"set", "ip-config:eth0", "IPv4Address", "192.0.2.255", "--force"});
    EXPECT_THAT(forced.err, HasSubstr("done all the same: "));
    EXPECT_THAT(state(host), HasSubstr("192.0.2.255/24"));
}

HOST_TEST_F(ChangesInForce, SetBringsAnAddressIntoTheRunningHost) {
    const Finished run = cvagent(host, {"set", "ip-config:eth0", "IPv4Address", "192.0.2.77"});
    EXPECT_EQ(run.status, 0) << run.err;
    EXPECT_THAT(run.out, HasSubstr("    old  192.0.2.10\n    new  192.0.2.77\n"));
    EXPECT_THAT(state(host), HasSubstr("192.0.2.77/24 default via 192.0.2.1"));
}

/// What a plan foresees is what then is: of the kernel, of the files.
HOST_TEST_F(ChangesInForce, APlanForeseesThem) {
    host.file("/root/changes", moveFile());
    const std::string before = state(host);
    const Finished plan = cvagent(host, {"plan", "/root/changes", "--json"});
    ASSERT_EQ(plan.status, 0) << plan.err;
    EXPECT_EQ(state(host), before) << "nothing has happened";
    const Json foreseen = Json::parse(plan.out)["plan"];
    ASSERT_EQ(cvagent(host, {"apply", "/root/changes", "--verify-within", "0"}).status, 0);
    const Finished then = cvagent(host, {"plan", "computer", "OwnerName", "x", "--json"});
    const Json now = Json::parse(then.out)["plan"];
    EXPECT_EQ(foreseen["kernelAfter"], now["kernelBefore"]);
    for (const Json& file : foreseen["files"]) {
        EXPECT_EQ(host.read(file["path"].get<std::string>()), file["after"]["content"].get<std::string>())
            << file["path"];
    }
    EXPECT_GE(foreseen["files"].size(), 3U);
}

/// /sys shows the host's links, which nothing was done to.
HOST_TEST_F(ChangesInForce, APlanTakesAnInterfaceDown) {
    const Finished plan = cvagent(host, {"plan", "ip-config:eth0", "InterfaceState", "12"});
    EXPECT_EQ(plan.status, 0) << plan.err;
    EXPECT_THAT(plan.out, HasSubstr("ifconfig eth0 down"));
    EXPECT_THAT(plan.out, Not(HasSubstr("still up")));
}

/// No file of the plug-in's, and a system that keeps it in a way that leaves nothing to change.
void leaveNothingToWriteTo(FakeHost& host) {
    host.run({"sh", "-c", "rm /etc/sysconfig/network/ifcfg-eth-id-*"});
    host.file("/run/network/ifstate", "eth0=eth0\n");
    host.file("/etc/network/interfaces", "iface eth0 inet manual\n");
}

HOST_TEST_F(ChangesInForce, APlanOfWhatCannotTakeFails) {
    leaveNothingToWriteTo(host);
    const Finished plan = cvagent(host, {"plan", "ip-config:eth0", "IPv4Address", "192.0.2.77"});
    EXPECT_EQ(plan.status, 1);
    EXPECT_THAT(plan.out, HasSubstr("there is no file "));
}

HOST_TEST_F(ChangesInForce, APlanOfWhatNobodyKeepsShowsTheRunningHost) {
    host.run({"sh", "-c", "rm /etc/sysconfig/network/ifcfg-eth-id-*"});
    const Finished plan = cvagent(host, {"plan", "ip-config:eth0", "IPv4Address", "192.0.2.77"});
    EXPECT_EQ(plan.status, 0) << plan.out;
    EXPECT_THAT(plan.out, HasSubstr("FILES\n  as before\n"));
    EXPECT_THAT(plan.out, HasSubstr("- address eth0 192.0.2.10/24\n"));
    EXPECT_THAT(plan.out, HasSubstr("+ address eth0 192.0.2.77/24\n"));
}

/// None is made when one of them, tried out, does not come about.
HOST_TEST_F(ChangesInForce, WhatCannotTakeKeepsAllOfThemBack) {
    leaveNothingToWriteTo(host);
    host.file("/root/changes",
              R"([{"node": "ip-config:eth0", "property": "IPv4Address", "value": "192.0.2.77"},
                                   {"node": "computer", "property": "OwnerName", "value": "x"}])");
    const Finished run = cvagent(host, {"apply", "/root/changes"});
    EXPECT_EQ(run.status, 1);
    EXPECT_THAT(run.err, HasSubstr("tried out, it fails: there is no file "));
    EXPECT_EQ(cvagent(host, {"get", "computer", "OwnerName"}).out.find("OwnerName  x"), std::string::npos);
    EXPECT_EQ(cvagent(host, {"apply", "/root/changes", "--force", "--verify-within", "0"}).status, 1);
    EXPECT_NE(cvagent(host, {"get", "computer", "OwnerName"}).out.find("OwnerName  x"), std::string::npos);
}

HOST_TEST_F(ChangesInForce, APlanIsReadByPeople) {
    const Finished plan = cvagent(host, {"plan", "ip-config:eth0", "IPv4Address", "192.0.2.77"});
    EXPECT_EQ(plan.status, 0) << plan.err;
    EXPECT_THAT(plan.out, HasSubstr("    old  192.0.2.10\n    new  192.0.2.77\n"));
    EXPECT_THAT(plan.out, HasSubstr("-IPADDR=192.0.2.10\n+IPADDR=192.0.2.77\n"));
    EXPECT_THAT(plan.out, HasSubstr("\n- address eth0 192.0.2.10/24\n"));
    EXPECT_THAT(plan.out, HasSubstr("\n+ address eth0 192.0.2.77/24\n"));
    const Finished refused = cvagent(host, {"plan", "ip-config:eth0", "IPv4Address", "192.0.2.255"});
    EXPECT_EQ(refused.status, 4);
    EXPECT_THAT(refused.err, HasSubstr("refused without --force"));
    EXPECT_THAT(refused.out, HasSubstr("+IPADDR=192.0.2.255\n"));
    const Finished same = cvagent(host, {"plan", "ip-config:eth0", "IPv4Address", "192.0.2.10"});
    EXPECT_EQ(same.status, 0);
    EXPECT_THAT(same.out, testing::StartsWith("unchanged  "));
}

/// The history has the plan with the first of the writes, and the verdict of each.
HOST_TEST_F(ChangesInForce, AreKeptWithTheirPlan) {
    host.file("/root/changes", moveFile());
    ASSERT_EQ(cvagent(host, {"apply", "/root/changes", "--verify-within", "0"}).status, 0);
    const Finished history = host.run({CVAGENT_PROGRAM, "history", "--json", "--kind", "written"});
    std::istringstream lines(history.out);
    std::vector<Json> entries;
    for (std::string line; std::getline(lines, line);) {
        entries.push_back(Json::parse(line));
    }
    ASSERT_EQ(entries.size(), 3U) << history.out << history.err;
    EXPECT_EQ(entries[0]["property"]["name"], "IPv4Address");
    EXPECT_GE(entries[0]["plan"]["files"].size(), 3U);
    EXPECT_EQ(entries[0]["verdict"], "applied");
    EXPECT_FALSE(entries[1].contains("plan"));
    EXPECT_THAT(entries[1]["verdict"].get<std::string>(),
                HasSubstr("applied: the route default via 192.0.2.1 dev eth0 is gone: "));
    EXPECT_EQ(entries[2]["verdict"], "applied");
}

/// Somebody who sets the old address again as soon as the write is in the history: with a subnet of its own,
/// so that it does not go with the new one, and the interface is never without an address.
HOST_TEST_F(ChangesInForce, WhoeverChangesItBackIsTold) {
    host.file("/root/changes", "[" + changeOf("ip-config:eth0", "IPv4Address", "192.0.2.77") + "]");
    host.realTool("sleep");
    RunningProgram daemon =
        host.start({"sh", "-c",
                    "until [ -e /var/lib/corvista/history.db ]; do sleep 0.05; done; "
                    "ip address add 192.0.2.10/25 dev eth0; ip address del 192.0.2.77/24 dev eth0; "
                    "exec ip monitor address"});
    const Finished run = cvagent(host, {"apply", "/root/changes", "--verify-within", "20"});
    EXPECT_EQ(run.status, 1) << run.out;
    EXPECT_THAT(run.out, HasSubstr("differs    "));
    EXPECT_THAT(run.out, HasSubstr("somebody has changed it back"));
    const Finished history = host.run({CVAGENT_PROGRAM, "history", "--kind", "changed"});
    EXPECT_THAT(history.out, HasSubstr("IPv4Address: 192.0.2.77 -> 192.0.2.10  (differs: "));
    daemon.signal(SIGKILL);
}

}  // namespace
