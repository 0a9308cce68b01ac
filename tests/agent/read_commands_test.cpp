// tree, get and properties, by running the program.
#include <gmock/gmock.h>

#include <barrier>
#include <nlohmann/json.hpp>

#include "agent/core/reader.h"
#include "tests/agent/cvagent_run.h"
#include "tests/support/no_threads.h"

namespace {

using testing::HasSubstr;
using testing::IsEmpty;
using testing::Not;
using testing::StartsWith;
using Json = nlohmann::ordered_json;

HOST_TEST(TreeCommand, DrawsTheNodes) {
    const Finished run = CvagentRun(host)({"tree"});
    EXPECT_EQ(run.status, 0);
    EXPECT_THAT(run.err, IsEmpty());
    EXPECT_EQ(run.out, R"(oshw [1]  OsHw Management Interface
`-- root [2]  ROOT Node
    `-- computer [3]  Computer: fake
        `-- chassis [4]
            |-- planar [5]  Planar
            |   |-- disk-controller [6]  Disk Controller
            |   |   `-- hard-drive:sda [7]  Hard Drive: 80.0 GB (74.5 GiB)
            |   `-- processor:1 [11]  Processor: 2400 MHz
            `-- network-controller [8]  Network Controller
                `-- network-port:eth0 [9]  Network Port: down, 1 Gbit/s
                    `-- ip-config:eth0 [10]  IP Configuration
)");
}

HOST_TEST(TreeCommand, DrawsWithLinesWhereTheLocaleHasThem) {
    const Finished run = CvagentRun(host).setting("LANG=en_US.UTF-8")({"tree"});
    EXPECT_THAT(run.out, HasSubstr("\u2514\u2500\u2500 root"));
    const Finished plain = CvagentRun(host).setting("LANG=en_US.UTF-8").setting("LC_ALL=C")({"tree"});
    EXPECT_THAT(plain.out, HasSubstr("`-- root"));
}

HOST_TEST(TreeCommand, PrintsJson) {
    const Finished run = CvagentRun(host)({"tree", "--json"});
    ASSERT_EQ(run.status, 0);
    const Json tree = Json::parse(run.out);
    EXPECT_EQ(tree["plugin"], FAKE_PLUGIN_FILE);
    ASSERT_EQ(tree["nodes"].size(), 11U);
    EXPECT_EQ(tree["nodes"][9]["path"],
              "/oshw/root/computer/chassis/network-controller/network-port:eth0/ip-config:eth0");
    EXPECT_EQ(tree["nodes"][9]["properties"].dump(),
              R"({"24":{"name":"IPOrigin","kind":"enum","value":3},)"
              R"("94":{"name":"DNSServers","kind":"texts","value":["192.0.2.53"]},)"
              R"("108":{"name":"InterfaceName","kind":"text","value":"eth0"},)"
              R"("125":{"name":"InterfaceStates","kind":"numbers","value":[0,1,12]}})");
}

HOST_TEST(TreeCommand, ShowsWhatThePluginReportsWhileItStarts) {
    const Finished run = CvagentRun(host).telling("errors")({"tree"});
    EXPECT_EQ(run.status, 0);
    EXPECT_EQ(run.err,
              "cvagent: the plug-in reports: first error [fake]\n"
              "cvagent: the plug-in reports: second error [fake] (2 times)\n");
}

HOST_TEST(TreeCommand, ShowsTheFirstFiftyErrorsAndHowManyMoreThereAre) {
    const Finished run = CvagentRun(host).telling("manyerrors")({"tree"});
    EXPECT_EQ(run.status, 0);
    EXPECT_THAT(run.err, StartsWith("cvagent: the plug-in reports: error 0 [fake]\n"));
    EXPECT_THAT(run.err, testing::EndsWith("cvagent: the plug-in reports: error 49 [fake]\n"
                                           "cvagent: the plug-in reports: and 10 more; --log FILE keeps them "
                                           "all\n"));
}

HOST_TEST(TreeCommand, AnswersThePluginThatAsksForNodes) {
    CvagentRun cvagent(host);
    EXPECT_EQ(cvagent.telling("find")({"tree"}).status, 0);
    EXPECT_THAT(cvagent.diary(), HasSubstr("\nhard-drive:sda: Hard Drive\n"));
    EXPECT_THAT(cvagent.diary(), HasSubstr("\nnowhere: there is no node 'nowhere'"));
    EXPECT_THAT(cvagent.diary(), HasSubstr("\nforeign: not a node of the framework\n"));
    EXPECT_THAT(cvagent.diary(), testing::EndsWith("\nat the end: no plug-in is loaded\n"));
}

HOST_TEST(TreeCommand, HandsThePluginItsNumbers) {
    CvagentRun cvagent(host);
    cvagent({"tree"});
    EXPECT_EQ(cvagent.diary(), "initialize 1 1 2\nunload\n");
}

HOST_TEST(GetCommand, ReadsNamedProperties) {
    const Finished run = CvagentRun(host)({"get", "computer", "HostName", "127"});
    EXPECT_EQ(run.status, 0);
    EXPECT_THAT(run.err, IsEmpty());
    EXPECT_EQ(run.out,
              "/oshw/root/computer [3]  Computer\n"
              "    108  HostName        fake\n"
              "    127  TimeZoneOffset  -210 min, UTC-03:30\n");
}

HOST_TEST(GetCommand, ListsWhatItKnowsAndWhatItDoesNot) {
    const Finished run = CvagentRun(host)({"get", "ip-config:eth0"});
    EXPECT_EQ(run.status, 0);
    EXPECT_THAT(run.out, HasSubstr("     24  IPOrigin          3 (static)\n"));
    EXPECT_THAT(run.out, HasSubstr("     25  IPv4Address       not known\n"));
    EXPECT_THAT(run.out, HasSubstr("    125  InterfaceStates   0, 1 (up), 12 (down)\n"));
    EXPECT_THAT(run.out, Not(HasSubstr("EnumeratePorts")));
}

HOST_TEST(GetCommand, AFailedReadEndsWithStatusOneAndThePluginsErrors) {
    const Finished run = CvagentRun(host)({"get", "computer", "108", "901"});
    EXPECT_EQ(run.status, 1);
    EXPECT_THAT(run.out, HasSubstr("108  HostName  fake\n"));
    EXPECT_THAT(run.out, HasSubstr("901  901       not known (the host does not answer)\n"));
    EXPECT_EQ(run.err, "cvagent: the plug-in reports: no answer from the host [fake]\n");
}

HOST_TEST(GetCommand, WhatThePluginThrowsIsAFailedRead) {
    const Finished run = CvagentRun(host)({"get", "computer", "902", "--json"});
    EXPECT_EQ(run.status, 1);
    EXPECT_EQ(Json::parse(run.out)["properties"].dump(),
              R"({"902":{"name":"902","kind":"none","error":"the plug-in threw: thrown by the plug-in"}})");
}

HOST_TEST(GetCommand, WhatIsThrownWithoutATextIsAFailedRead) {
    const Finished run = CvagentRun(host)({"get", "computer", "903"});
    EXPECT_EQ(run.status, 1);
    EXPECT_THAT(run.out, HasSubstr("not known (the plug-in threw an unknown exception)\n"));
}

HOST_TEST(GetCommand, PrintsOneNodeAsJsonInTheOrderAskedFor) {
    const Finished run = CvagentRun(host)({"get", "3", "127", "900", "108", "--json"});
    ASSERT_EQ(run.status, 0) << run.err;
    const Json node = Json::parse(run.out);
    EXPECT_EQ(node["class"], "computer");
    EXPECT_EQ(node["properties"].dump(), R"({"127":{"name":"TimeZoneOffset","kind":"number","value":-210.0},)"
                                         R"("900":{"name":"900","kind":"text","value":"slow"},)"
                                         R"("108":{"name":"HostName","kind":"text","value":"fake"}})");
}

HOST_TEST(GetCommand, WhatIsNotThereEndsWithStatusThree) {
    CvagentRun cvagent(host);
    for (const std::vector<std::string>& words :
         std::vector<std::vector<std::string>>{{"get", "99"},
                                               {"get", "eth0"},
                                               {"get", "nowhere"},
                                               {"get", "computer", "NoSuch"},
                                               {"get", "computer", "999"},
                                               {"get", "computer", "DriveSize"},
                                               {"get", "ip-config:eth0", "EnumeratePorts"},
                                               {"get", "computer", ""},
                                               {"get", ""}}) {
        const Finished run = cvagent(words);
        EXPECT_EQ(run.status, 3) << words.back();
        EXPECT_THAT(run.err, StartsWith("cvagent: ")) << words.back();
    }
}

TEST(Reading, ReadsGoSideBySideAndKeepTheirOrder) {
    /// Answers only when two reads are under way at once.
    class Pair : public IC::MutableNode {
    public:
        using MutableNode::MutableNode;
        IC::Error getProperty(unsigned int id, IC::PropertyValue& out) const override {
            both_.arrive_and_wait();
            out = IC::PropertyValue(IC::Number(id), true);
            return {};
        }

    private:
        mutable std::barrier<> both_{2};
    };
    const auto node = std::make_shared<Pair>(1U, 0U, std::vector<unsigned int>{1}, 40U, 0U);
    cvagent::Pool pool;
    cvagent::Facts facts;
    std::vector<unsigned int> ids;
    for (const cvagent::Reading& reading :
         cvagent::Reader(pool, facts)
             .read(node, {7, 3, 5, 1}, cvagent::Freshness::now, cvagent::Request("test"))) {
        ids.push_back(static_cast<unsigned int>(reading.value));
    }
    EXPECT_THAT(ids, testing::ElementsAre(7, 3, 5, 1));
}

TEST(Reading, WithoutMoreThreadsOneReadsAll) {
    const auto node = std::make_shared<IC::MutableNode>(1U, 0U, std::vector<unsigned int>{1}, 40U, 0U);
    cvagent::Pool pool;
    cvagent::Facts facts;
    const NoThreads none;
    const auto readings =
        cvagent::Reader(pool, facts).read(node, {7, 3, 5}, cvagent::Freshness::now, cvagent::Request("test"));
    ASSERT_EQ(readings.size(), 3U);
    EXPECT_EQ(readings[0].error, "no such property: 7");
    EXPECT_EQ(readings[2].error, "no such property: 5");
}

HOST_TEST(PropertiesCommand, ListsAllClassesWithoutThePlugin) {
    const Finished run = CvagentRun(host).plugin("/nowhere")({"properties"});
    EXPECT_EQ(run.status, 0);
    for (const std::string name : {"oshw", "computer", "hard-drive", "partition", "network-port", "ip-config",
                                   "lan-endpoint", "team", "processor"}) {
        EXPECT_THAT("\n" + run.out, HasSubstr("\n" + name + "\n"));
    }
    EXPECT_THAT(run.out, HasSubstr("accepts: 1 (on), 9 (restart), 12 (halt)"));
    EXPECT_FALSE(host.exists("/opt/vantrel"));
}

HOST_TEST(PropertiesCommand, ListsOneClassAsJson) {
    const Finished run = CvagentRun(host)({"properties", "hard-drive", "--json"});
    ASSERT_EQ(run.status, 0);
    const Json rows = Json::parse(run.out);
    ASSERT_EQ(rows.size(), 3U);
    EXPECT_EQ(rows[0]["name"], "DriveSize");
    EXPECT_EQ(rows[0]["unit"], "kB");
}

HOST_TEST(PropertiesCommand, AnUnknownClassListsTheKnownOnes) {
    const Finished run = CvagentRun(host)({"properties", "drive"});
    EXPECT_EQ(run.status, 3);
    EXPECT_THAT(run.err, HasSubstr("hard-drive"));
}

}  // namespace
