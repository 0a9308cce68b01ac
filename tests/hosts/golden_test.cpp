// The tree of every recorded host below this directory, as cvagent shows it. CORVISTA_REWRITE_GOLDEN=1
// rewrites the expectations instead of comparing.
#include <gmock/gmock.h>

#include <sys/mman.h>

#include <algorithm>
#include <cstdlib>
#include <cstring>
#include <filesystem>
#include <fstream>
#include <regex>
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

/// A text that a fake host's body hands out to the test.
class HandedOut {
public:
    HandedOut()
        : memory_(mmap(nullptr, kSize, PROT_READ | PROT_WRITE, MAP_SHARED | MAP_ANONYMOUS | MAP_NORESERVE, -1,
                       0)) {}
    ~HandedOut() { munmap(memory_, kSize); }
    HandedOut(const HandedOut&) = delete;
    HandedOut& operator=(const HandedOut&) = delete;

    void set(const std::string& text) const {
        memcpy(memory_, text.c_str(), std::min(text.size() + 1, kSize));
    }
    std::string get() const { return static_cast<const char*>(memory_); }

private:
    static constexpr std::size_t kSize = 64UL << 20;
    void* memory_;
};

/// What a run of cvagent on a recorded host shows and logs.
struct Seen {
    std::string tree;
    std::string log;
};

/// What the first thread logs until it stops the plug-in: how far the monitors come until then is a matter of
/// time, and so is how many pipes are open besides one's own.
std::string logOfTheStart(const std::string& log) {
    static const std::regex line("([^ ]+) ([0-9]+) (.*)");
    static const std::regex count("Count value [0-9]+");
    std::istringstream in(log);
    std::string thread;
    std::string kept;
    std::smatch match;
    for (std::string text;
         std::getline(in, text) && text.find("HardDriveUpdateMonitor::stop: entry") == std::string::npos;) {
        const bool begins = std::regex_match(text, match, line);
        thread = begins && thread.empty() ? match[2].str() : thread;
        if (begins && match[2] == thread) {
            kept += std::regex_replace(match[3].str(), count, "Count value") + '\n';
        }
    }
    return kept;
}

/// Of all others the tools are the host's own, as they were recorded.
bool needsAdapters(const std::string& name) {
    return name == "todays-names";
}

/// Of forty network cards of one kind five, eth1 and eth10 among them: hundreds of shells for each of the
/// others would tell nothing more.
void leaveOutMostCards(FakeHost& host) {
    static const std::regex others(" *eth([3-9]|1[1-9]|[2-9][0-9]):[^\n]*\n");
    const std::string devices = host.read("/proc/net/dev").value_or("");
    if (std::ranges::count(devices, '\n') > 40) {
        host.file("/proc/net/dev", std::regex_replace(devices, others, ""));
    }
}

using HostChange = void (*)(FakeHost&);

Seen look(FakeHost& host, const std::string& name, bool json, const std::string& commands,
          HostChange changeHost) {
    host.copyTree(name);
    if (changeHost != nullptr) {
        changeHost(host);
    }
    std::vector<std::string> words = {CVAGENT_PROGRAM,
                                      "--host-tools",
                                      needsAdapters(name) ? "auto" : "native",
                                      "--commands",
                                      commands,
                                      "--plugin",
                                      CORVISTA_PLUGIN_FILE,
                                      "--trace",
                                      "/var/trace",
                                      "tree"};
    if (json) {
        words.emplace_back("--json");
    }
    const Finished run = host.run(words, kLongest);
    EXPECT_EQ(run.status, 0) << run.err;
    EXPECT_EQ(run.err.find("Sanitizer"), std::string::npos) << run.err;
    return {lasting(run.out), logOfTheStart(host.read("/var/trace").value_or(""))};
}

Seen seenOn(const std::string& name, bool json, const std::string& commands,
            HostChange changeHost = nullptr) {
    const HandedOut tree;
    const HandedOut log;
    inFakeHost(
        [&](FakeHost& host) {
            const Seen seen = look(host, name, json, commands, changeHost);
            tree.set(seen.tree);
            log.set(seen.log);
        },
        kLongest);
    return {tree.get(), log.get()};
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

void expectTrees(const std::string& name) {
    const bool rewrite = std::getenv("CORVISTA_REWRITE_GOLDEN") != nullptr;
    int compared = 0;
    for (const char* expectation : kExpectations) {
        const fs::path expected = kHosts / name / expectation;
        if (!fs::exists(expected)) {
            continue;
        }
        ++compared;
        const Seen seen = seenOn(name, expected.extension() == ".json", "direct");
        if (rewrite) {
            std::ofstream(expected) << seen.tree;
        } else {
            EXPECT_EQ(seen.tree, content(expected)) << expected;
        }
    }
    EXPECT_GT(compared, 0) << "an empty expected-tree.txt or expected-tree.json is filled when rewritten";
}

/// One test of all hosts: what a property is changes in all of them at once.
TEST(RecordedHosts, ShowTheirTrees) {
    for (const std::string& name : recordedHosts()) {
        SCOPED_TRACE(name);
        expectTrees(name);
    }
}

class RecordedHost : public testing::TestWithParam<std::string> {};

/// The one test that keeps real shells for all of a host's commands.
TEST_P(RecordedHost, IsTheSameThroughShells) {
    const Seen direct = seenOn(GetParam(), true, "direct", leaveOutMostCards);
    const Seen shells = seenOn(GetParam(), true, "shell", leaveOutMostCards);
    EXPECT_EQ(direct.tree, shells.tree);
    EXPECT_EQ(direct.log, shells.log);
    EXPECT_THAT(direct.log, testing::HasSubstr("initialize: exit"));
}

INSTANTIATE_TEST_SUITE_P(Golden, RecordedHost, testing::ValuesIn(recordedHosts()), [](const auto& host) {
    std::string name = host.param;
    std::replace(name.begin(), name.end(), '-', '_');
    return name;
});

}  // namespace
