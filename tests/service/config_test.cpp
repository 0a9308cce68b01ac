#include <gmock/gmock.h>

#include <sys/stat.h>

#include <fstream>
#include <regex>
#include <sstream>

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

std::string contentOf(const std::string& file) {
    std::ostringstream text;
    text << std::ifstream(file).rdbuf();
    return text.str();
}

/// What agent.conf(5) says of a key.
std::string sectionOf(const std::string& key) {
    const std::string page = contentOf(PACKAGING_DIR "/agent.conf.5");
    const std::string name = std::regex_replace(key, std::regex("-"), "\\-");
    const std::size_t start = page.find(".TP\n.B " + name + "\n");
    return start == std::string::npos ? "" : page.substr(start, page.find("\n.", start + 7) - start);
}

bool isTaken(const std::string& key, long value) {
    return parseConfig(key + " = " + std::to_string(value)).complaints.empty();
}

TEST(ServiceConfig, TheInstalledFileAndThePageSayWhatHolds) {
    const std::string file = contentOf(PACKAGING_DIR "/agent.conf");
    const std::regex setting("(^|\n)#([a-z-]+) = (\\S+)");
    std::string all;
    for (std::sregex_iterator each(file.begin(), file.end(), setting); each != std::sregex_iterator();
         ++each) {
        const std::string key = (*each)[2];
        const std::string section = sectionOf(key);
        EXPECT_THAT(section, testing::HasSubstr("Default: " + (*each)[3].str() + ".")) << key;
        std::smatch bounds;
        if (std::regex_search(section, bounds, std::regex("([0-9]+) to ([0-9]+)"))) {
            EXPECT_THAT(file, testing::HasSubstr(bounds.str())) << key;
            EXPECT_TRUE(isTaken(key, std::stol(bounds[1])) && isTaken(key, std::stol(bounds[2]))) << key;
            EXPECT_FALSE(isTaken(key, std::stol(bounds[2]) + 1)) << key;
            EXPECT_TRUE(bounds[1] <= "1" || !isTaken(key, std::stol(bounds[1]) - 1)) << key;
        }
        all += key + " = " + (*each)[3].str() + "\n";
    }
    const auto read = parseConfig(all);
    EXPECT_THAT(read.complaints, IsEmpty());
    const cvagent::service::Config standard;
    EXPECT_EQ(read.config.lookEvery, standard.lookEvery);
    EXPECT_EQ(read.config.settlingTime, standard.settlingTime);
    EXPECT_EQ(read.config.commandTime, standard.commandTime);
    EXPECT_EQ(read.config.trustedGroup, standard.trustedGroup);
    EXPECT_EQ(read.config.historyAge, standard.historyAge);
    EXPECT_EQ(read.config.historyBytes, standard.historyBytes);
    EXPECT_EQ(std::count(all.begin(), all.end(), '\n'), 6);
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
