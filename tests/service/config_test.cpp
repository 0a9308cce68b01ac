#include <gmock/gmock.h>

#include <sys/stat.h>

#include "agent/core/problem.h"
#include "agent/service/config.h"
#include "tests/support/fake_host.h"

namespace {

using cvagent::service::parseConfig;
using cvagent::service::readConfig;
using testing::ElementsAre;
using testing::IsEmpty;

TEST(ServiceConfig, SaysNothingWhereNothingStands) {
    const auto read = parseConfig("\n# a comment\n   \n\t# another\r\n");
    EXPECT_THAT(read.complaints, IsEmpty());
    EXPECT_EQ(read.config.lookEvery.count(), 600);
    EXPECT_EQ(read.config.trustedGroup, "corvista");
}

TEST(ServiceConfig, TakesEachKey) {
    const auto read = parseConfig(
        "look-every=30\n settling-time =  200 \ncommand-timeout = 0\ntrusted-group = adm_2-x\n"
        "history-days = 7\nhistory-size = 2\n");
    EXPECT_THAT(read.complaints, IsEmpty());
    EXPECT_EQ(read.config.lookEvery.count(), 30);
    EXPECT_EQ(read.config.settlingTime.count(), 200);
    EXPECT_EQ(read.config.commandTime.count(), 0);
    EXPECT_EQ(read.config.trustedGroup, "adm_2-x");
    EXPECT_EQ(read.config.historyAge, std::chrono::hours(7 * 24));
    EXPECT_EQ(read.config.historyBytes, 2097152U);
    EXPECT_EQ(parseConfig("look-every = 0").config.lookEvery.count(), 0);
}

TEST(ServiceConfig, TellsEachWrongLineWithItsNumber) {
    EXPECT_THAT(
        parseConfig("look-every = 9\n\nnonsense\nlook-sometimes = 1\nlook-every = 10\nsettling-time = 1001\n"
                    "command-timeout = 1.5\ntrusted-group = a b\ncommand-timeout = -1")
            .complaints,
        ElementsAre("line 1: look-every is '9', but takes seconds from 10 to 86400, or 0 for never",
                    "line 3: 'nonsense' is no \"key = value\"", "line 4: there is no key 'look-sometimes'",
                    "line 5: a second look-every",
                    "line 6: settling-time is '1001', but takes milliseconds from 0 to 1000",
                    "line 7: command-timeout is '1.5', but takes seconds from 1 to 3600, or 0 for no limit",
                    "line 8: trusted-group is 'a b', but takes the name of a group",
                    "line 9: a second command-timeout"));
    EXPECT_EQ(parseConfig(std::string(1000, '\n') + "x\ny").complaints.front(),
              "line 1001: 'x' is no \"key = value\"");
    std::string many;
    for (int i = 0; i < 1000; ++i) {
        many += "wrong\n";
    }
    EXPECT_EQ(parseConfig(many).complaints.size(), 20U);
    EXPECT_THAT(parseConfig(std::string("look\0every = 1\n", 15)).complaints,
                ElementsAre("line 1: there is no key 'look\\x00every'"));
}

std::string problemOf(const std::string& file, bool mustExist = true) {
    try {
        readConfig(file, mustExist);
        return "";
    } catch (const cvagent::Problem& problem) {
        return problem.what();
    }
}

HOST_TEST(ServiceConfig, IsReadFromAFileThatNobodyElseCanWrite) {
    EXPECT_EQ(problemOf("/etc/agent.conf", false), "");
    EXPECT_EQ(problemOf("/etc/agent.conf"), "there is no file '/etc/agent.conf'");
    host.file("/etc/agent.conf", "look-every = 20\n");
    EXPECT_EQ(readConfig("/etc/agent.conf", true).config.lookEvery.count(), 20);
    host.file("/etc/agent.conf", "look-every = 20\n", 0662);
    EXPECT_EQ(problemOf("/etc/agent.conf"), "cannot read '/etc/agent.conf': others than root can write it");
    host.directory("/etc/dir");
    EXPECT_EQ(problemOf("/etc/dir"), "cannot read '/etc/dir': it is no file");
    host.file("/etc/long", std::string(70000, '#'));
    EXPECT_EQ(problemOf("/etc/long"), "cannot read '/etc/long': it is too long");
    ASSERT_EQ(mkfifo("/etc/pipe", 0600), 0);
    EXPECT_EQ(problemOf("/etc/pipe"), "cannot read '/etc/pipe': it is no file");
    if (host.giveToStranger("/etc/long")) {
        EXPECT_EQ(problemOf("/etc/long"), "cannot read '/etc/long': others than root can write it");
    }
}

}  // namespace
