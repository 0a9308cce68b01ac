// The tree of every recorded host below hosts/. CORVISTA_REWRITE_GOLDEN=1 writes the results anew.
#include <gtest/gtest.h>

#include <filesystem>

#include "tests/hardware/golden.h"
#include "tests/hardware/recorded_host.h"

namespace {

namespace fs = std::filesystem;

class RecordedHosts : public testing::TestWithParam<std::string> {
protected:
    RecordedHosts() { recorded_.unpack(directory_ + "/files"); }

    const std::string directory_ = CORVISTA_TESTS_DIR "/hardware/hosts/" + GetParam();
    RecordedHost recorded_;
};

std::vector<std::string> names() {
    std::vector<std::string> all;
    for (const auto& entry : fs::directory_iterator(CORVISTA_TESTS_DIR "/hardware/hosts")) {
        if (entry.is_directory()) {
            all.push_back(entry.path().filename());
        }
    }
    std::sort(all.begin(), all.end());
    return all;
}

TEST_P(RecordedHosts, TreeIsAsExpected) {
    const std::string tree = golden::tree(recorded_.root());
    EXPECT_EQ(tree, golden::expected(directory_ + "/expected.txt", tree));
}

TEST_P(RecordedHosts, WhatIsForTrustedOnesIsNotToldToOthers) {
    hardware::HardwareMI plugin{recorded_.host(false)};
    ASSERT_EQ(plugin.initialize(1, IC::Number(1U), IC::Number(2U)).getStatus(), 0);
    for (const auto& node : plugin.holdAll()) {
        for (const hardware::Row& row : hardware::allRows()) {
            IC::PropertyValue value;
            EXPECT_FALSE(row.audience == hardware::Audience::trusted &&
                         node->getProperty(row.id, value).getStatus() == 0)
                << row.name;
        }
    }
}

INSTANTIATE_TEST_SUITE_P(All, RecordedHosts, testing::ValuesIn(names()), [](const auto& host) {
    std::string name = host.param;
    std::replace(name.begin(), name.end(), '-', '_');
    return name;
});

}  // namespace
