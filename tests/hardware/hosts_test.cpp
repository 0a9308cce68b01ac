// The tree of every recorded host below hosts/. CORVISTA_REWRITE_GOLDEN=1 writes the results anew.
#include <gtest/gtest.h>
#include <sys/stat.h>

#include <algorithm>
#include <ctime>
#include <filesystem>
#include <random>

#include "tests/hardware/golden.h"
#include "tests/hardware/recorded_host.h"
#include "tests/hardware/recorded_hosts.h"

namespace {

namespace fs = std::filesystem;

class RecordedHosts : public testing::TestWithParam<std::string> {
protected:
    RecordedHosts() { recorded_.unpack(directory_ + "/files"); }

    const std::string directory_ = recordedHosts() + "/" + GetParam();
    RecordedHost recorded_;
};

TEST_P(RecordedHosts, TreeIsAsExpected) {
    const std::string tree = golden::tree(recorded_.root());
    EXPECT_EQ(tree, golden::expected(directory_ + "/expected.txt", tree));
}

/// What firmware, a device or somebody who made the files of a container could put in the place of a file.
void damage(const fs::path& path, std::mt19937& random) {
    std::error_code ignored;
    fs::remove_all(path, ignored);
    switch (random() % 9) {
        case 0:
            fs::create_directory(path, ignored);
            break;
        case 1:
            fs::create_symlink(path.filename(), path, ignored);
            break;
        case 2:
            fs::create_directory_symlink(".", path, ignored);
            break;
        case 3:
            mkfifo(path.c_str(), 0600);
            break;
        case 4:
            std::ofstream(path) << std::string(3 << 20, '\xff');
            break;
        case 5:
            std::ofstream(path) << "\x1b]0;x\x07\xc3(\0\n\xe2\x80\xaex";
            break;
        case 6:
            std::ofstream(path) << "99999999999999999999";
            break;
        case 7:
            std::ofstream(path) << "-9223372036854775808:";
            break;
        default:
            break;
    }
}

void expectPrintable(const std::string& text, const std::string& where) {
    const bool plain = std::all_of(text.begin(), text.end(), [](char byte) {
        return static_cast<unsigned char>(byte) >= ' ' && byte != '\x7f';
    });
    EXPECT_TRUE(plain) << where << ": " << text;
}

#if defined(__SANITIZE_THREAD__)  // which makes the work several times as long
constexpr std::clock_t kLongest = 100 * CLOCKS_PER_SEC;
#else
constexpr std::clock_t kLongest = 20 * CLOCKS_PER_SEC;
#endif

TEST_P(RecordedHosts, ThatSomebodyHasDamagedAreReadWithoutHarm) {
    std::mt19937 random(static_cast<unsigned int>(GetParam().size()));
    std::vector<fs::path> all;
    for (const auto& entry : fs::recursive_directory_iterator(recorded_.root())) {
        all.push_back(entry.path());
    }
    std::sort(all.begin(), all.end());  // the same damage on each machine
    hardware::HardwareMI plugin{recorded_.host()};
    ASSERT_EQ(plugin.initialize(1, IC::Number(1U), IC::Number(2U)).getStatus(), 0);
    const std::clock_t start = std::clock();
    for (int round = 0; round < 8; ++round) {
        for (int count = 0; count < 20; ++count) {
            damage(all[random() % all.size()], random);
        }
        plugin.lookAgain("");
        for (const auto& node : plugin.holdAll()) {
            std::map<unsigned int, IC::PropertyValue> stored;
            node->getProperties(stored);
            for (const auto& [id, value] : stored) {
                expectPrintable(golden::text(value), std::to_string(id));
            }
        }
    }
    EXPECT_LT(std::clock() - start, kLongest);
}

TEST_P(RecordedHosts, WhatIsForTrustedOnesIsNotToldToOthers) {
    hardware::HardwareMI plugin{recorded_.host(false)};
    ASSERT_EQ(plugin.initialize(1, IC::Number(1U), IC::Number(2U)).getStatus(), 0);
    for (const auto& node : plugin.holdAll()) {
        for (const hardware::Row& row : hardware::allRows()) {
            IC::PropertyValue value;
            EXPECT_FALSE(row.traits.trusted && node->getProperty(row.id, value).getStatus() == 0) << row.name;
        }
    }
}

INSTANTIATE_TEST_SUITE_P(All, RecordedHosts, testing::ValuesIn(namesOfRecordedHosts()), nameOfTest);

}  // namespace
