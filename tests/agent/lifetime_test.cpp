// Loading and unloading plug-ins again and again, and reading nodes while they come and go.
#include <dlfcn.h>
#include <gmock/gmock.h>

#include <atomic>
#include <filesystem>
#include <thread>

#include "agent/core/log_output.h"
#include "agent/core/reading.h"
#include "agent/core/surroundings.h"
#include "agent/core/tree.h"
#include "framework/qx/thread.h"
#include "tests/agent/started_plugin.h"
#include "tests/support/fake_host.h"

namespace {

using cvagent::Event;

std::size_t entries(const std::string& directory) {
    const std::filesystem::directory_iterator all(directory);
    return static_cast<std::size_t>(std::distance(begin(all), end(all)));
}

/// What a process must not gather: threads and descriptors.
std::pair<std::size_t, std::size_t> holdings() {
    return {entries("/proc/self/task"), entries("/proc/self/fd")};
}

/// The holdings, once they are as before: a thread that was joined can be seen for a moment longer.
std::pair<std::size_t, std::size_t> holdingsBackAt(const std::pair<std::size_t, std::size_t>& before) {
    for (int i = 0; i < 500 && holdings() != before; ++i) {
        std::this_thread::sleep_for(std::chrono::milliseconds(10));
    }
    return holdings();
}

/// Counts what it hears.
class Counter : public cvagent::Listener {
public:
    void hear(const Event& event) override {
        ++(event.kind == Event::Kind::withdrawn ? withdrawn : published);
    }
    std::atomic<int> published{0};
    std::atomic<int> withdrawn{0};
};

void loadAgainAndAgain(const std::string& file, int times, double clockSpeed = 1) {
    const cvagent::LogOutput log({}, std::make_shared<cvagent::ErrorLines>());
    { StartedPlugin first(file, nullptr); }  // what the C library keeps from its first use
    const auto before = holdings();
    for (int i = 0; i < times; ++i) {
        Counter counter;
        QX::setClockSpeed(clockSpeed);
        StartedPlugin plugin(file, &counter);
        ASSERT_GE(plugin.interface().holdAll().size(), 7U) << i;
        QX::setClockSpeed(1);  // the stop waits for the monitors as long as it ever does
    }
    EXPECT_EQ(holdingsBackAt(before), before);
    EXPECT_EQ(dlopen(file.c_str(), RTLD_LAZY | RTLD_NOLOAD), nullptr) << "still mapped";
}

HOST_TEST(PluginLifetime, TwoHundredLoadsLeaveNothingBehind) {
    setenv("CORVISTA_FAKE_PLUGIN", "churn", 1);
    loadAgainAndAgain(FAKE_PLUGIN_FILE, 200);
}

HOST_TEST(PluginLifetime, TwoHundredLoadsOfTheRealPluginLeaveNothingBehind) {
    const cvagent::QuietCommands quiet;
    loadAgainAndAgain(CORVISTA_PLUGIN_FILE, 200);
    EXPECT_THAT(host.listDirectory("/tmp"), testing::IsEmpty());
}

HOST_TEST(PluginLifetime, MonitorsStoppedInTheMiddleOfAPassLeaveNothingBehind) {
    host.tool("fdisk -ls",
              "Disk /dev/sda: 80.0 GB, 80026361856 bytes\n/dev/sda1  *  1  13  104391  83  Linux\n");
    const cvagent::QuietCommands quiet;
    loadAgainAndAgain(CORVISTA_PLUGIN_FILE, 20, 100000);  // one loading after the other
    EXPECT_THAT(host.listDirectory("/tmp"), testing::IsEmpty());
}

HOST_TEST(PluginLifetime, APluginThatStaysMappedIsLeftWithoutACallback) {
    const cvagent::QuietCommands quiet;
    const cvagent::LogOutput log({}, std::make_shared<cvagent::ErrorLines>());
    void* const mapped = dlopen(CORVISTA_PLUGIN_FILE, RTLD_NOW | RTLD_LOCAL);
    ASSERT_NE(mapped, nullptr);
    Counter counter;
    IC::ManagementInterface* interface = nullptr;
    {
        StartedPlugin plugin(CORVISTA_PLUGIN_FILE, &counter);
        interface = &plugin.interface();
    }
    auto* const node = new IC::MutableNode(900, 1, {1}, 11, 1);
    EXPECT_EQ(interface->addNewNode(node).getStatus(), 0);
    EXPECT_EQ(interface->deleteNode(node).getStatus(), 0);
    EXPECT_EQ(counter.published + counter.withdrawn, 0);
    dlclose(mapped);
}

HOST_TEST(PluginLifetime, TwoHundredFailuresLeaveNothingBehind) {
    setenv("CORVISTA_FAKE_PLUGIN", "badstart churn", 1);
    EXPECT_ANY_THROW(
        StartedPlugin(FAKE_PLUGIN_FILE, nullptr));  // what the C library keeps from its first use
    const auto before = holdings();
    for (int i = 0; i < 200; ++i) {
        EXPECT_ANY_THROW(StartedPlugin(FAKE_PLUGIN_FILE, nullptr));
    }
    EXPECT_EQ(holdingsBackAt(before), before);
}

HOST_TEST(PluginLifetime, NodesAreReadWhileTheyComeAndGo) {
    setenv("CORVISTA_FAKE_PLUGIN", "churn alert", 1);
    Counter counter;
    std::atomic<int> reads{0};
    {
        StartedPlugin plugin(FAKE_PLUGIN_FILE, &counter);
        std::vector<std::jthread> readers;
        for (int i = 0; i < 4; ++i) {
            readers.emplace_back([&](const std::stop_token& stop) {
                while (!stop.stop_requested()) {
                    for (const cvagent::Handle& node : plugin.interface().holdAll()) {
                        cvagent::readProperty(*node, 89);
                        ++reads;
                    }
                    cvagent::setPaths(plugin.interface());
                }
            });
        }
        std::this_thread::sleep_for(std::chrono::milliseconds(500));
    }
    EXPECT_GT(reads, 0);
    EXPECT_GT(counter.published, 0);
    EXPECT_GT(counter.withdrawn, 0);
}

HOST_TEST(PluginLifetime, HandlesKeepWithdrawnNodesAlive) {
    setenv("CORVISTA_FAKE_PLUGIN", "churn", 1);
    Counter counter;
    StartedPlugin plugin(FAKE_PLUGIN_FILE, &counter);
    cvagent::Handle drive;
    while (!drive) {
        for (const cvagent::Handle& node : plugin.interface().holdAll()) {
            drive = cvagent::pathComponent(*node) == "hard-drive:sdb" ? node : drive;
        }
    }
    const int seen = counter.withdrawn;
    while (counter.withdrawn < seen + 2) {
        std::this_thread::yield();
    }
    EXPECT_EQ(cvagent::readProperty(*drive, 37).error, "");
    EXPECT_EQ(drive->getPath(), "/oshw/root/computer/chassis/planar/disk-controller/hard-drive:sdb");
}

HOST_TEST(PluginLifetime, RebuiltDrivesReplaceTheOldOnes) {
    const cvagent::QuietCommands quiet;
    host.file("/proc/cpuinfo", "processor\t: 0\n");
    host.tool("fdisk -ls",
              "Disk /dev/sda: 80.0 GB, 80026361856 bytes\n/dev/sda1   1  13  104391  83  Linux\n");
    QX::setClockSpeed(1000);  // the monitor's two minutes in an eighth of a second
    Counter counter;
    StartedPlugin plugin(CORVISTA_PLUGIN_FILE, &counter);
    for (int i = 0; i < 3000 && counter.published < 2; ++i) {
        std::this_thread::sleep_for(std::chrono::milliseconds(10));
    }
    EXPECT_EQ(counter.published, 2);  // an unchanged layout is built anew once and then left alone
    EXPECT_EQ(counter.withdrawn, 2);
    std::vector<std::string> paths;
    for (const cvagent::Handle& node : plugin.interface().holdAll()) {
        if (node->getPath().find("disk-controller/") != std::string::npos) {
            paths.push_back(node->getPath());
        }
    }
    const std::string above = "/oshw/root/computer/chassis/planar/disk-controller/";
    EXPECT_THAT(paths, testing::ElementsAre(above + "hard-drive:sda", above + "partition:sda1"));
    QX::setClockSpeed(1);
}

}  // namespace
