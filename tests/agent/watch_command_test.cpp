// watch, by running the program.
#include <gmock/gmock.h>

#include <nlohmann/json.hpp>
#include <sstream>

#include "tests/agent/cvagent_run.h"

namespace {

using testing::EndsWith;
using testing::HasSubstr;
using testing::StartsWith;
using Json = nlohmann::ordered_json;

HOST_TEST(WatchCommand, PrintsPublishedAndWithdrawnNodes) {
    const Finished run = CvagentRun(host).telling("churn")({"watch", "--for", "1"});
    EXPECT_EQ(run.status, 0);
    const std::string path =
        "/oshw/root/computer/chassis/planar/disk-controller/hard-drive:sdb  Hard Drive\n";
    EXPECT_THAT(run.out, HasSubstr("Z  published  " + path));
    EXPECT_THAT(run.out, HasSubstr("Z  withdrawn  " + path));
    EXPECT_THAT(run.err, StartsWith("cvagent: watching 1"));
}

HOST_TEST(WatchCommand, PrintsAlertsWithPathMessageAndCodes) {
    const Finished run = CvagentRun(host).telling("alert")({"watch", "--for", "2"});
    EXPECT_THAT(run.out,
                EndsWith("Z  alert      /oshw/root/computer/chassis/network-controller/network-port:eth0  "
                         "NIC is Offline  (codes 1, 0, 12)\n"));
}

HOST_TEST(WatchCommand, AlertsThatComeWhileThePluginStartsHaveTheirPath) {
    const Finished run = CvagentRun(host).telling("early")({"watch", "--for", "0"});
    EXPECT_THAT(run.out,
                HasSubstr("alert      /oshw/root/computer/chassis/network-controller/network-port:eth0  "));
}

HOST_TEST(WatchCommand, PrintsOneObjectALine) {
    const Finished run = CvagentRun(host).telling("churn alert")({"watch", "--json", "--for", "2"});
    ASSERT_EQ(run.status, 0);
    std::istringstream lines(run.out);
    std::map<std::string, int> seen;
    for (std::string line; std::getline(lines, line);) {
        const Json event = Json::parse(line);
        ++seen[event["event"]];
        if (event["event"] == "alert") {
            EXPECT_EQ(event["message"], "NIC is Offline ");
            EXPECT_EQ(event["codes"].dump(), R"({"first":1,"second":0,"event":12})");
        } else {
            EXPECT_EQ(event["class"], "hard-drive");
        }
    }
    EXPECT_EQ(seen["alert"], 1);
    EXPECT_GT(seen["published"], 0);
    EXPECT_EQ(seen["published"], seen["withdrawn"]);
}

HOST_TEST(WatchCommand, ShowsTheChangeThatIsSeenWhileThePluginStops) {
    const Finished run = CvagentRun(host).telling("late")({"watch", "--for", "0"});
    EXPECT_EQ(run.status, 0);
    EXPECT_THAT(run.out, HasSubstr("NIC is Offline"));
}

HOST_TEST(WatchCommand, ErrorsOfThePluginAreShownAsTheyCome) {
    const Finished run = CvagentRun(host).telling("errors")({"watch", "--for", "0"});
    EXPECT_EQ(run.status, 0);
    EXPECT_THAT(run.err, HasSubstr("first error"));
}

}  // namespace
