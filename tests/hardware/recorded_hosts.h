#pragma once

#include <gtest/gtest.h>

#include <algorithm>
#include <filesystem>
#include <string>
#include <vector>

/// The directory that holds the recorded hosts.
inline std::string recordedHosts() {
    return CORVISTA_TESTS_DIR "/hardware/hosts";
}

inline std::vector<std::string> namesOfRecordedHosts() {
    std::vector<std::string> all;
    for (const auto& entry : std::filesystem::directory_iterator(recordedHosts())) {
        if (entry.is_directory()) {
            all.push_back(entry.path().filename());
        }
    }
    std::sort(all.begin(), all.end());
    return all;
}

/// The host's name as that of a test can be.
inline std::string nameOfTest(const testing::TestParamInfo<std::string>& host) {
    std::string name = host.param;
    std::replace(name.begin(), name.end(), '-', '_');
    return name;
}
