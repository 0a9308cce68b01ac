// What the built plug-in shows the dynamic loader.
#include <dlfcn.h>
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <array>
#include <atomic>
#include <chrono>
#include <cstdio>
#include <memory>
#include <stdexcept>
#include <thread>

#include "framework/ic/management_interface.h"
#include "framework/qx/thread.h"
#include "tests/support/fake_host.h"
#include "tests/support/texts_are.h"
#include "tests/support/waiting.h"

namespace {

const std::string kPlugin = CORVISTA_PLUGIN;

std::vector<std::string> linesOf(const std::string& command) {
    const std::unique_ptr<FILE, int (*)(FILE*)> pipe(popen(command.c_str(), "r"), pclose);
    std::array<char, 4096> buffer{};
    std::vector<std::string> found;
    while (fgets(buffer.data(), buffer.size(), pipe.get()) != nullptr) {
        std::string line(buffer.data());
        line.erase(line.find_last_not_of('\n') + 1);
        found.push_back(line);
    }
    return found;
}

std::vector<std::string> dynamicSection(const std::string& tag) {
    return linesOf("readelf -dW '" + kPlugin + "' | sed -n 's/.*(" + tag + ").*\\[\\(.*\\)\\]/\\1/p'");
}

TEST(Library, ExportsTheEntryAndTheProcessorBuilderAlone) {
    EXPECT_THAT(linesOf("nm -D --defined-only '" + kPlugin + "' | awk '{print $3}'"),
                testing::UnorderedElementsAre("OpenMI", "_ZN2IC6OsHwMI14createCpuNodesEv"));
}

TEST(Library, HasItsSoname) {
    EXPECT_THAT(dynamicSection("SONAME"), TextsAre("libvantrelcvicoshwmi.so.1"));
}

TEST(Library, NeedsTheFrameworkAndTheLanguageRuntimeAlone) {
    for (const std::string& needed : dynamicSection("NEEDED")) {
        EXPECT_THAT(needed, testing::AnyOf("libvantrelcvframework.so.1", "libstdc++.so.6", "libgcc_s.so.1",
                                           "libc.so.6", "libm.so.6", testing::StartsWith("ld-linux"),
                                           testing::StartsWith("libasan"), testing::StartsWith("libubsan"),
                                           testing::StartsWith("libtsan")));
    }
    EXPECT_THAT(dynamicSection("NEEDED"), testing::Contains("libvantrelcvframework.so.1"));
}

using Entry = int (*)(IC::ManagementInterface**, IC::Error**);

/// The plug-in as an agent opens it.
struct Opened {
    Opened() {
        if (library == nullptr) {
            throw std::runtime_error(dlerror());
        }
        reinterpret_cast<Entry>(dlsym(library, "OpenMI"))(&interface, &error);
    }

    void* library = dlopen(kPlugin.c_str(), RTLD_NOW | RTLD_LOCAL);
    IC::ManagementInterface* interface = nullptr;
    IC::Error* error = nullptr;
};

bool isLoaded() {
    void* library = dlopen(kPlugin.c_str(), RTLD_NOW | RTLD_NOLOAD);
    if (library != nullptr) {
        dlclose(library);
    }
    return library != nullptr;
}

HOST_TEST(Library, ClosedWithoutAnUnloadLeavesNoThreadInCodeThatIsGone) {
    std::thread([] {}).join();  // what a sanitizer starts beside the first thread of a process
    const std::size_t before = runningThreads();
    const Opened plugin;
    plugin.interface->initialize(1, IC::Number(1U), IC::Number(2U));
    EXPECT_EQ(runningThreads(), before + 2) << "the two monitors";
    dlclose(plugin.library);
    EXPECT_FALSE(isLoaded());
    EXPECT_EQ(runningThreads(), before);
}

HOST_TEST(Library, OpenedAgainStartsAsItDidTheFirstTime) {
    for (int time = 0; time < 2; ++time) {
        const Opened plugin;
        EXPECT_TRUE(plugin.interface->holdAll().empty());
        EXPECT_EQ(plugin.interface->initialize(1, IC::Number(1U), IC::Number(2U)).getStatus(), 0);
        EXPECT_EQ(plugin.interface->holdAll().size(), 7U);
        EXPECT_EQ(plugin.interface->unload().getStatus(), 0);
        dlclose(plugin.library);
        ASSERT_FALSE(isLoaded());
    }
}

/// An agent that does not come back from an alert before it may.
struct Stuck {
    std::atomic<bool> called{false};
    std::atomic<bool> go{false};

    static IC::Error hear(const std::vector<IC::Alert>&, const void* context) {
        auto* stuck = const_cast<Stuck*>(static_cast<const Stuck*>(context));
        stuck->called = true;
        while (!stuck->go) {
            std::this_thread::sleep_for(std::chrono::milliseconds(1));
        }
        return {};
    }
};

HOST_TEST(Library, StaysMappedAsLongAsACallbackHangs) {
    host.copyTree("suse-two-nics");
    host.file("/opt/vantrel/corvista/data/oshwminetind.dat", "eth0=12\n");
    std::thread([] {}).join();
    const std::size_t before = runningThreads();
    const Opened plugin;
    Stuck stuck;
    plugin.interface->registerForAlerts(Stuck::hear, &stuck);
    plugin.interface->initialize(1, IC::Number(1U), IC::Number(2U));
    ASSERT_TRUE(eventually([&] { return stuck.called.load(); }));
    QX::setClockSpeed(100);  // eleven seconds pass in 110 ms
    EXPECT_EQ(plugin.interface->unload().getStatus(), 0);
    EXPECT_EQ(dlclose(plugin.library), 0);
    EXPECT_TRUE(isLoaded());
    EXPECT_EQ(runningThreads(), before + 2) << "the one that hangs, and the one that looks for its commands";
    stuck.go = true;
    EXPECT_TRUE(eventually([&] { return runningThreads() == before; }));
}

TEST(Library, HandsOutTheSameTwoAddressesEveryTime) {
    void* library = dlopen(kPlugin.c_str(), RTLD_NOW | RTLD_LOCAL);
    ASSERT_NE(library, nullptr) << dlerror();
    const auto open = reinterpret_cast<Entry>(dlsym(library, "OpenMI"));
    ASSERT_NE(open, nullptr);
    std::array<IC::ManagementInterface*, 2> interfaces{};
    std::array<IC::Error*, 2> errors{};
    EXPECT_EQ(open(&interfaces[0], &errors[0]), 0);
    EXPECT_EQ(open(&interfaces[1], &errors[1]), 0);
    EXPECT_NE(interfaces[0], nullptr);
    EXPECT_NE(errors[0], nullptr);
    EXPECT_EQ(interfaces[0], interfaces[1]);
    EXPECT_EQ(errors[0], errors[1]);
    EXPECT_EQ(errors[0]->getStatus(), 0);
    dlclose(library);
}

}  // namespace
