// The tree of every recorded host below this directory, as cvagent shows it. CORVISTA_REWRITE_GOLDEN=1
// rewrites the expectations instead of comparing (with CORVISTA_TEST_WRITABLE_BUILD=1, for they pass through
// the build directory).
#include <gmock/gmock.h>

#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <sstream>

#include "tests/support/fake_host.h"

namespace {

namespace fs = std::filesystem;

const fs::path kHosts = fs::path(CORVISTA_TESTS_DIR) / "hosts";
constexpr std::chrono::seconds kLongest(200);
constexpr const char* kExpectations[] = {"expected-tree.txt", "expected-tree.json"};

std::string content(const fs::path& file) {
    std::ostringstream text;
    text << std::ifstream(file).rdbuf();
    return text.str();
}

/// Without what is of this build and of this moment: the plug-in's path, the time, the machine's own zone.
std::string lasting(const std::string& text) {
    std::istringstream in(text);
    std::string kept;
    bool inCurrentTime = false;
    for (std::string line; std::getline(in, line);) {
        if (line.find("\"CurrentTime\"") != std::string::npos) {
            inCurrentTime = true;
        }
        const bool isValue = line.find("\"value\"") != std::string::npos;
        if (line.find("\"plugin\"") == std::string::npos && !(inCurrentTime && isValue)) {
            kept += line + '\n';
        }
        inCurrentTime = inCurrentTime && !isValue;
    }
    return kept;
}

std::string treeOf(FakeHost& host, const std::string& name, bool json) {
    host.copyTree(name);
    std::vector<std::string> words = {CVAGENT_PROGRAM, "--host-tools",       "native",
                                      "--plugin",      CORVISTA_PLUGIN_FILE, "tree"};
    if (json) {
        words.emplace_back("--json");
    }
    const Finished run = host.run(words, kLongest);
    EXPECT_EQ(run.status, 0) << run.err;
    EXPECT_EQ(run.err.find("Sanitizer"), std::string::npos) << run.err;
    return lasting(run.out);
}

class RecordedHost : public testing::TestWithParam<std::string> {};

TEST_P(RecordedHost, ShowsItsTree) {
    const bool rewrite = std::getenv("CORVISTA_REWRITE_GOLDEN") != nullptr;
    const fs::path passedOut = fs::path(CORVISTA_BUILD_DIR) / (GetParam() + ".golden");
    int compared = 0;
    for (const char* expectation : kExpectations) {
        const fs::path expected = kHosts / GetParam() / expectation;
        if (!fs::exists(expected)) {
            continue;
        }
        ++compared;
        const bool json = expected.extension() == ".json";
        inFakeHost(
            [&](FakeHost& host) {
                const std::string tree = treeOf(host, GetParam(), json);
                if (rewrite) {
                    std::ofstream(passedOut) << tree;
                } else {
                    EXPECT_EQ(tree, content(expected)) << expected;
                }
            },
            kLongest);
        if (rewrite) {
            fs::copy_file(passedOut, expected, fs::copy_options::overwrite_existing);
            fs::remove(passedOut);
        }
    }
    EXPECT_GT(compared, 0) << "an empty expected-tree.txt or expected-tree.json is filled when rewritten";
}

std::vector<std::string> recordedHosts() {
    std::vector<std::string> found;
    for (const auto& entry : fs::directory_iterator(kHosts)) {
        if (entry.is_directory()) {
            found.push_back(entry.path().filename());
        }
    }
    std::sort(found.begin(), found.end());
    return found;
}

INSTANTIATE_TEST_SUITE_P(Golden, RecordedHost, testing::ValuesIn(recordedHosts()), [](const auto& host) {
    std::string name = host.param;
    std::replace(name.begin(), name.end(), '-', '_');
    return name;
});

}  // namespace
