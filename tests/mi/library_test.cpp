// What the built plug-in shows the dynamic loader.
#include <dlfcn.h>
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <array>
#include <cstdio>
#include <filesystem>
#include <memory>
#include <sstream>

#include "framework/ic/management_interface.h"

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
    EXPECT_THAT(dynamicSection("SONAME"), testing::ElementsAre("libvantrelcvicoshwmi.so.1"));
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

TEST(Library, HandsOutTheSameTwoAddressesEveryTime) {
    void* library = dlopen(kPlugin.c_str(), RTLD_NOW | RTLD_LOCAL);
    ASSERT_NE(library, nullptr) << dlerror();
    const auto open =
        reinterpret_cast<int (*)(IC::ManagementInterface**, IC::Error**)>(dlsym(library, "OpenMI"));
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
