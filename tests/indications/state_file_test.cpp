#include <gmock/gmock.h>
#include <signal.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cstdlib>
#include <random>

#include "indications/globals.h"
#include "tests/indications/interfaces.h"
#include "tests/support/failing_new.h"
#include "tests/support/fake_host.h"
#include "tests/support/log_capture.h"
#include "tests/support/texts_are.h"

namespace {

using testing::ElementsAre;
using testing::IsEmpty;
using testing::Pair;

/// What an entry of a property file takes of the heap.
constexpr std::size_t kEntrySize = sizeof(std::_Rb_tree_node<std::pair<const std::wstring, std::wstring>>);
constexpr char kFile[] = "/opt/vantrel/corvista/data/oshwminetind.dat";

HOST_TEST(StateFile, OfTheFirstPassHoldsOneLineForEachPort) {
    host.directory("/opt/vantrel/corvista/data");
    Interfaces interfaces;
    interfaces.add("eth0", 1);
    interfaces.add("eth1", 12);
    interfaces.previous()["stale"] = 1;
    IC::OSHWMI_IND::datFileAvailable = true;
    LogCapture capture;
    interfaces.mi().readPrevNetNodeMap();
    EXPECT_THAT(interfaces.previous(), IsEmpty());
    EXPECT_FALSE(IC::OSHWMI_IND::datFileAvailable);
    interfaces.mi().createCurNetNodeMap();
    interfaces.mi().writePrevNetNodeMap();
    EXPECT_EQ(host.read(kFile), "eth0=1\neth1=12\n");
    EXPECT_THAT(capture.ownMessages(3000),
                testing::IsSupersetOf({"readPrevNetNodeMap: entry", "OSHWMI_NET_IND_DAT_FILE: Not available",
                                       "readPrevNetNodeMap: exit", "writePrevNetNodeMap: entry",
                                       "writePrevNetNodeMap: exit"}));
    EXPECT_THAT(capture.ownMessages(6000), IsEmpty()) << "a first start without a file is no error";
}

HOST_TEST(StateFile, IsReadBackAsItWasWritten) {
    host.directory("/opt/vantrel/corvista/data");
    Interfaces interfaces;
    interfaces.current() = {
        {"bond0", 32}, {"eth0.10", 1}, {"eth0", 4294967295U}, {"\xc3\xa4=\\", 12}, {"\xff", 33}};
    interfaces.mi().writePrevNetNodeMap();
    interfaces.mi().readPrevNetNodeMap();
    EXPECT_EQ(interfaces.previous(), interfaces.current());
    EXPECT_TRUE(IC::OSHWMI_IND::datFileAvailable);
}

HOST_TEST(StateFile, KeepsTheKeysOfInterfacesThatHaveDisappeared) {
    host.file(kFile, "eth9=12\neth0=12\n");
    Interfaces interfaces;
    interfaces.current() = {{"eth0", 1}};
    interfaces.mi().writePrevNetNodeMap();
    EXPECT_EQ(host.read(kFile), "eth0=1\neth9=12\n");
}

HOST_TEST(StateFile, LosesADamagedLineAlone) {
    host.file(kFile,
              "eth0=1\nrubbish\neth1=twelve\neth2=12x\neth3=\neth4=33\neth5=+1\neth6= "
              "1\neth7=-1\neth9=4294967296\n");
    Interfaces interfaces;
    interfaces.previous() = {{"eth8", 1}};
    interfaces.mi().readPrevNetNodeMap();
    EXPECT_THAT(interfaces.previous(), ElementsAre(Pair("eth0", 1), Pair("eth4", 33)));
    EXPECT_TRUE(IC::OSHWMI_IND::datFileAvailable);
}

HOST_TEST(StateFile, StandsInTheDataDirectoryOfTheAgent) {
    setenv("CORVISTA_DATA_DIR", "/var/lib/agent/", 1);
    host.directory("/var/lib/agent");
    Interfaces interfaces;
    interfaces.current() = {{"eth0", 1}};
    interfaces.mi().writePrevNetNodeMap();
    EXPECT_EQ(host.read("/var/lib/agent/oshwminetind.dat"), "eth0=1\n");
}

HOST_TEST(StateFile, IsDoneWithoutWhateverReadingAndWritingItThrow) {
    host.file(kFile, "eth0=12\n");
    Interfaces interfaces;
    interfaces.current() = {{"eth0", 1}};
    interfaces.previous() = {{"eth0", 1}};
    IC::OSHWMI_IND::datFileAvailable = true;
    LogCapture capture;
    {
        const FailingNew none(kEntrySize, [] { throw 7; });
        interfaces.mi().readPrevNetNodeMap();
        interfaces.mi().writePrevNetNodeMap();
    }
    EXPECT_THAT(interfaces.previous(), IsEmpty());
    EXPECT_FALSE(IC::OSHWMI_IND::datFileAvailable);
    EXPECT_THAT(capture.ownMessages(),
                TextsAre("readPrevNetNodeMap: entry", "OSHWMI_NET_IND_DAT_FILE: Not available",
                         "readPrevNetNodeMap: exit", "writePrevNetNodeMap: entry",
                         "OSHWMI_NET_IND_DAT_FILE: Exception in writing file", "writePrevNetNodeMap: exit"));
    EXPECT_EQ(host.read(kFile), "eth0=12\n");
}

HOST_TEST(StateFile, IsDoneWithoutWhenThereIsNoDataDirectory) {
    setenv("CORVISTA_DATA_DIR", "", 1);
    Interfaces interfaces;
    interfaces.current() = {{"eth0", 1}};
    LogCapture capture;
    interfaces.mi().writePrevNetNodeMap();
    interfaces.mi().readPrevNetNodeMap();
    EXPECT_THAT(capture.ownMessages(5000), testing::SizeIs(2));
    EXPECT_THAT(capture.ownMessages(6000), TextsAre("OSHWMI_NET_IND_DAT_FILE: Exception in writing file"));
    EXPECT_FALSE(IC::OSHWMI_IND::datFileAvailable);
}

HOST_TEST(StateFile, StaysAsItWasWhenItCannotBeWritten) {
    host.file(kFile, "eth0=12\n");
    host.readOnly("/opt/vantrel/corvista/data");
    Interfaces interfaces;
    interfaces.current() = {{"eth0", 1}};
    LogCapture capture;
    interfaces.mi().writePrevNetNodeMap();
    EXPECT_THAT(capture.ownMessages(6000), TextsAre("OSHWMI_NET_IND_DAT_FILE: Exception in writing file"));
    EXPECT_EQ(host.read(kFile), "eth0=12\n");
}

HOST_TEST(StateFile, SurvivesAKillAtAnyMoment) {
    host.directory("/opt/vantrel/corvista/data");
    std::map<std::string, unsigned int> all;
    for (int i = 0; i < 500; ++i) {
        all["eth" + std::to_string(i)] = 1;
    }
    Interfaces interfaces;
    interfaces.current() = all;
    interfaces.mi().writePrevNetNodeMap();
    std::mt19937 random(1);
    for (int round = 0; round < 20; ++round) {
        const pid_t writer = fork();
        if (writer == 0) {
            for (unsigned int state = 2;; ++state) {
                for (auto& [name, current] : interfaces.current()) {
                    current = state;
                }
                interfaces.mi().writePrevNetNodeMap();
            }
        }
        usleep(random() % 5000);
        kill(writer, SIGKILL);
        waitpid(writer, nullptr, 0);
        interfaces.mi().readPrevNetNodeMap();
        ASSERT_EQ(interfaces.previous().size(), all.size());
        const unsigned int first = interfaces.previous().begin()->second;
        for (const auto& [name, state] : interfaces.previous()) {
            ASSERT_EQ(state, first) << "a mix of two passes";
        }
    }
}

}  // namespace
