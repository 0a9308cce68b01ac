// What is told of every recorded host below hosts/. CORVISTA_REWRITE_GOLDEN=1 rewrites the expectations
// instead of comparing.
#include "tests/hardware/golden.h"

#include <gmock/gmock.h>

#include <cstdlib>
#include <fstream>
#include <sstream>

namespace {

namespace fs = std::filesystem;

class RecordedHardware : public testing::TestWithParam<std::string> {};

std::string content(const fs::path& file) {
    std::ostringstream text;
    text << std::ifstream(file).rdbuf();
    return text.str();
}

std::vector<std::string> hosts() {
    std::vector<std::string> names;
    for (const auto& entry : fs::directory_iterator(hardware_test::recordedHosts())) {
        if (entry.is_directory()) {
            names.push_back(entry.path().filename());
        }
    }
    std::sort(names.begin(), names.end());
    return names;
}

TEST_P(RecordedHardware, IsToldAsExpected) {
    const fs::path directory = hardware_test::recordedHosts() / GetParam();
    const std::string told = hardware_test::told(hardware::Host(directory, true));
    const fs::path expected = directory / "expected.txt";
    if (getenv("CORVISTA_REWRITE_GOLDEN") != nullptr) {
        std::ofstream(expected) << told;
    }
    EXPECT_EQ(told, content(expected));
}

TEST_P(RecordedHardware, TellsNothingTrustedToOthers) {
    const std::string told =
        hardware_test::told(hardware::Host(hardware_test::recordedHosts() / GetParam(), false));
    EXPECT_THAT(told, testing::Not(testing::HasSubstr("(trusted)")));
}

INSTANTIATE_TEST_SUITE_P(Hosts, RecordedHardware, testing::ValuesIn(hosts()), [](const auto& one) {
    std::string name = one.param;
    std::replace(name.begin(), name.end(), '-', '_');
    return name;
});

}  // namespace
