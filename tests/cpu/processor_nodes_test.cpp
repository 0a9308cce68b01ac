#include <gmock/gmock.h>

#include <atomic>
#include <chrono>
#include <new>
#include <thread>

#include "framework/cvlog/logger.h"
#include "oshwmi/os_hw_mi.h"
#include "tests/support/command_lines.h"
#include "tests/support/failing_new.h"
#include "tests/support/fake_host.h"
#include "tests/support/log_capture.h"
#include "tests/support/no_descriptors.h"
#include "tests/support/plugin_access.h"
#include "tests/support/shell_stub.h"
#include "tests/support/texts_are.h"

namespace {

using IC::Number;
using IC::PropertyValue;
using testing::ElementsAre;

/// One processor's part of /proc/cpuinfo.
std::string processor(unsigned int number, const std::string& speed) {
    return "processor\t: " + std::to_string(number) +
           "\nvendor_id\t: GenuineIntel\ncpu family\t: 6\nmodel name\t: Intel(R) Xeon(R) CPU           E5410 "
           " @ 2.33GHz\n"
           "cpu MHz\t\t: " +
           speed + "\ncache size\t: 6144 KB\ncpu cores\t: 4\n\n";
}

/// The plug-in with its static tree, on a host without anything.
class Started {
public:
    Started() {
        mi_.initialize(1, Number(1U), Number(2U));
        for (const auto& node : mi_.holdAll()) {
            planar_ = node->nodeType() == 41 ? node->getNodeId() : planar_;
            lastId_ = node->getNodeId();
        }
    }
    Started(const Started&) = delete;
    Started& operator=(const Started&) = delete;
    ~Started() { mi_.unload(); }

    std::vector<std::shared_ptr<IC::MutableNode>> processors() const {
        std::vector<std::shared_ptr<IC::MutableNode>> found;
        for (const auto& node : mi_.holdAll()) {
            if (node->nodeType() == 4) {
                found.push_back(node);
            }
        }
        return found;
    }
    std::vector<std::string> speeds() const {
        std::vector<std::string> found;
        for (const auto& node : processors()) {
            PropertyValue speed("none", false);
            node->getProperty(80, speed);
            found.push_back(static_cast<std::string>(speed));
        }
        return found;
    }
    IC::OsHwMI& mi() { return mi_; }
    unsigned int planar() const { return planar_; }
    unsigned int lastId() const { return lastId_; }

private:
    IC::OsHwMI& mi_ = IC::myoshwmi;
    unsigned int planar_ = 0;
    unsigned int lastId_ = 0;
};

HOST_TEST(Processors, AreOneNodeEachUnderThePlanar) {
    host.file("/proc/cpuinfo", processor(0, "2394.230") + processor(1, "2394.230") +
                                   processor(2, "1000.999") + processor(3, "800"));
    Started plugin;
    EXPECT_TRUE(plugin.processors().empty()) << "start-up does not build them";
    plugin.mi().createCpuNodes();
    const auto nodes = plugin.processors();
    ASSERT_EQ(nodes.size(), 4U);
    for (unsigned int i = 0; i < 4; ++i) {
        EXPECT_EQ(nodes[i]->getIndex(), i + 1);
        EXPECT_EQ(nodes[i]->getNodeId(), plugin.lastId() + 1 + i);
        EXPECT_EQ(nodes[i]->getLinkedId(), plugin.planar());
        EXPECT_EQ(nodes[i]->getDescription(), "Processor");
        EXPECT_EQ(nodes[i]->getMIIds(), std::vector<unsigned int>{1});
    }
    EXPECT_THAT(IC::OsHwMITestAccess::drawnIds(), ElementsAre(2, 3, 4, 5, 6, 7, 8, 9, 10, 11));
    EXPECT_THAT(plugin.speeds(), TextsAre("2394", "2394", "1000", "800"));
    PropertyValue speed;
    EXPECT_EQ(nodes[0]->getProperty(80, speed).getStatus(), 0);
    EXPECT_EQ(speed, PropertyValue(Number(2394U), true));
}

HOST_TEST(Processors, GoWithoutSpeedWhenTheKernelTellsNone) {
    host.file("/proc/cpuinfo", "processor\t: 0\nprocessor\t: 1\ncpu MHz\t\t: 1200.000\n");
    Started plugin;
    plugin.mi().createCpuNodes();
    ASSERT_EQ(plugin.processors().size(), 2U);
    EXPECT_THAT(plugin.speeds(), TextsAre("1200", "none")) << "the first speed is the first processor's";
    EXPECT_EQ(plugin.processors()[1]->getDescription(), "");
}

HOST_TEST(Processors, StopAtTheEndOfTheMapWhenThereAreMoreSpeeds) {
    host.file("/proc/cpuinfo", processor(0, "1000.0") + "cpu MHz\t\t: 3000.000\n");
    Started plugin;
    plugin.mi().createCpuNodes();
    EXPECT_THAT(plugin.speeds(), TextsAre("1000"));
}

HOST_TEST(Processors, AreListedByOneCommand) {
    host.file("/proc/cpuinfo", processor(0, "1000.0"));
    Started plugin;
    const CommandLines commands;
    plugin.mi().createCpuNodes();
    EXPECT_THAT(commands.all(), TextsAre("cat /proc/cpuinfo 2> /dev/null |grep processor 2> /dev/null "));
}

HOST_TEST(Processors, AreNoneWithoutCpuinfo) {
    Started plugin;
    LogCapture capture;
    plugin.mi().createCpuNodes();
    EXPECT_TRUE(plugin.processors().empty());
    EXPECT_TRUE(capture.ownMessages(6000).empty());
}

HOST_TEST(Processors, SkipALineWithoutColon) {
    host.file("/proc/cpuinfo", "processor 0\n" + processor(1, "1000.0"));
    Started plugin;
    LogCapture capture;
    plugin.mi().createCpuNodes();
    EXPECT_EQ(plugin.processors().size(), 1U);
    EXPECT_THAT(capture.ownMessages(6000), TextsAre("Invalid format: buffer = processor 0\n"));
}

HOST_TEST(Processors, AreTheRowsWhoseKeyIsTheWordAlone) {
    host.file("/proc/cpuinfo",
              "processor\t: 0\nmodel name\t: Common KVM processor\ncpu MHz\t\t: 1000.0\n"
              "processor: 1\nmodel name\t: a processor: really\ncpu MHz\t\t: 2000.0\n"
              "processor \t \t: 2\nprocessors\t: 3\nprocessor 4\t: x\n processor\t: 5\ncoprocessor\t: 6\n"
              ": processor\n");
    Started plugin;
    LogCapture capture;
    plugin.mi().createCpuNodes();
    EXPECT_EQ(plugin.processors().size(), 3U);
    EXPECT_THAT(plugin.speeds(), TextsAre("1000", "2000", "none"));
    EXPECT_TRUE(capture.ownMessages(6000).empty()) << "they have a colon";
}

HOST_TEST(Processors, ReadLinesOf127Characters) {
    host.file("/proc/cpuinfo", "processor\t: " + std::string(150, 'x') + "\n");
    Started plugin;
    LogCapture capture;
    plugin.mi().createCpuNodes();
    EXPECT_EQ(plugin.processors().size(), 1U);
    EXPECT_THAT(capture.ownMessages(6000),
                TextsAre("Invalid format: buffer = " + std::string(150 - (127 - 12), 'x') + "\n"));
}

HOST_TEST(Processors, BuiltAgainStartFromOne) {
    host.file("/proc/cpuinfo", processor(0, "1000.0"));
    Started plugin;
    plugin.mi().createCpuNodes();
    plugin.mi().createCpuNodes();
    ASSERT_EQ(plugin.processors().size(), 2U);
    EXPECT_EQ(plugin.processors()[1]->getIndex(), 1U);
    EXPECT_THAT(plugin.speeds(), TextsAre("1000", "1000"));
}

HOST_TEST(Processors, AskedForByTwoAtOnceAreTwoWholeSets) {
    host.file("/proc/cpuinfo", processor(0, "1000.0") + processor(1, "2000.0"));
    Started plugin;
    std::atomic<int> underWay{0};
    std::atomic<bool> together{false};
    shell_stub::answerWith([&](const std::string&) {
        together = ++underWay > 1 || together;
        std::this_thread::sleep_for(std::chrono::milliseconds(50));
        --underWay;
        return "processor\t: 0\nprocessor\t: 1\n";
    });
    std::thread other([&] { plugin.mi().createCpuNodes(); });
    plugin.mi().createCpuNodes();
    other.join();
    shell_stub::answerWith({});
    EXPECT_FALSE(together) << "one waits for the other";
    std::vector<unsigned int> indexes;
    for (const auto& node : plugin.processors()) {
        indexes.push_back(node->getIndex());
    }
    EXPECT_THAT(indexes, ElementsAre(1, 2, 1, 2));
    EXPECT_THAT(plugin.speeds(), TextsAre("1000", "2000", "1000", "2000"));
}

HOST_TEST(Processors, AreNoneWhenTheShellCannotBeStarted) {
    host.file("/proc/cpuinfo", processor(0, "1000.0"));
    Started plugin;
    LogCapture capture;
    {
        const NoDescriptors none;
        plugin.mi().createCpuNodes();
    }
    EXPECT_TRUE(plugin.processors().empty());
    EXPECT_THAT(capture.ownMessages(6000), TextsAre("createCpuNodeAndMap(): cmd_cpu error"));
}

HOST_TEST(Processors, KeepTheirPlacesWhenTheyCannotBeListedAgain) {
    host.file("/proc/cpuinfo", processor(0, "1000.0"));
    Started plugin;
    plugin.mi().createCpuNodes();
    host.file("/proc/cpuinfo", processor(0, "2000.0"));
    shell_stub::failWhen([](const std::string&) { return true; });
    plugin.mi().createCpuNodes();
    shell_stub::failWhen({});
    EXPECT_THAT(plugin.speeds(), ElementsAre("2000")) << "only a listing empties the map";
}

HOST_TEST(Processors, OfAnEarlierStartAreNotDescribedAgain) {
    host.file("/proc/cpuinfo", processor(0, "1000.0"));
    std::shared_ptr<IC::MutableNode> earlier;
    {
        Started plugin;
        plugin.mi().createCpuNodes();
        earlier = plugin.processors().front();
    }
    earlier->setDescription("of an earlier start");
    Started plugin;
    shell_stub::failWhen([](const std::string&) { return true; });
    plugin.mi().createCpuNodes();
    shell_stub::failWhen({});
    EXPECT_EQ(earlier->getDescription(), "of an earlier start");
}

HOST_TEST(Processors, ThatTheAgentHasWithdrawnAreNotTouched) {
    host.file("/proc/cpuinfo", processor(0, "1000.0"));
    Started plugin;
    plugin.mi().createCpuNodes();
    const std::weak_ptr<IC::MutableNode> node = plugin.processors().front();
    EXPECT_EQ(plugin.mi().deleteNode(node.lock().get()).getStatus(), 0);
    EXPECT_TRUE(node.expired());
    shell_stub::failWhen([](const std::string&) { return true; });
    plugin.mi().createCpuNodes();  // which describes those of the last listing
    shell_stub::failWhen({});
    EXPECT_TRUE(plugin.processors().empty());
}

HOST_TEST(Processors, AnyAllocationMayFail) {
    host.file("/proc/cpuinfo", processor(0, "1000.0") + processor(1, "2000.0"));
    Started plugin;
    shell_stub::answerWith([](const std::string&) { return "processor\t: 0\nprocessor\t: 1\n"; });
    CVLog::CVLogger::setLog(nullptr, 0);
    long allocations = 0;
    for (bool failed = true; failed; ++allocations) {
        {
            const FailingOnce once(allocations);
            EXPECT_NO_THROW(plugin.mi().createCpuNodes()) << allocations;
            failed = once.happened();
        }
        const std::size_t before = plugin.processors().size();
        plugin.mi().createCpuNodes();
        const auto speeds = plugin.speeds();
        ASSERT_EQ(speeds.size(), before + 2);
        EXPECT_EQ(speeds[before], "1000");
        EXPECT_EQ(speeds[before + 1], "2000");
    }
    EXPECT_GT(allocations, 10);
    shell_stub::answerWith({});
}

HOST_TEST(Processors, SayThatThereWasNoMemoryForThem) {
    host.file("/proc/cpuinfo", processor(0, "1000.0"));
    Started plugin;
    LogCapture capture;
    {
        const FailingNew none(sizeof(IC::MutableNode), [] { throw std::bad_alloc(); });
        EXPECT_NO_THROW(plugin.mi().createCpuNodes());
    }
    EXPECT_THAT(capture.ownMessages(6000), ElementsAre("createCpuNodes failed: std::bad_alloc"));
    EXPECT_EQ(capture.ownMessages().back(), "createCpuNodes: exit");
    EXPECT_TRUE(plugin.processors().empty());
}

HOST_TEST(Processors, AreLeftAloneOutsideStartAndStop) {
    host.file("/proc/cpuinfo", processor(0, "1000.0"));
    IC::myoshwmi.createCpuNodes();
    EXPECT_TRUE(IC::myoshwmi.holdAll().empty());
}

HOST_TEST(Processors, SpeakWithTheirOwnSourceAndComponent) {
    host.file("/proc/cpuinfo", processor(0, "1000.0"));
    Started plugin;
    LogCapture capture;
    plugin.mi().createCpuNodes();
    EXPECT_THAT(capture.ownMessages(3000), TextsAre("createCpuNodes: entry", "createCpuNodeAndMap: entry",
                                                    "createCpuNodeAndMap: exit", "createCpuNodes: exit"));
    EXPECT_TRUE(capture.everyLineTwice());
    for (const LogLine& line : capture.ownLines()) {
        EXPECT_EQ(line.source, "OsHwMICpu_ix86");
        EXPECT_EQ(line.component, "Corvista.IC.MI.OsHwMICpu");
    }
}

}  // namespace
