// Each filter of the agent's runner against the tool that it stands for: the first byte picks the stage, the
// rest is what it reads.
#include <fcntl.h>
#include <spawn.h>
#include <sys/wait.h>
#include <unistd.h>

#include <array>
#include <cerrno>
#include <cstdint>
#include <cstdio>
#include <cstdlib>
#include <string>
#include <vector>

#include "agent/shell/filters/filters.h"

namespace {

using cvagent::shell::Filter;
using cvagent::shell::TextSource;
using cvagent::shell::Words;

struct Stage {
    std::unique_ptr<Filter> (*make)(Words, cvagent::shell::Manner);
    std::vector<std::string> words;  ///< the tool's name first
    std::string program = {};        ///< another one than that
};

cvagent::shell::Manner mannerOf(const std::string& program) {
    return {true, program == "/usr/bin/busybox"};
}

/// The stages of the plug-in's commands; with the system's tools, with gawk and with busybox, where there are
/// such.
std::vector<Stage> makeStages() {
    using namespace cvagent::shell;
    std::vector<Stage> all = {
        {makeGrep, {"grep", "Speed"}},
        {makeGrep, {"grep", "^Disk"}},
        {makeGrep, {"grep", "^0.0.0.0"}},
        {makeGrep, {"grep", "-v", "interfaces"}},
        {makeGrep, {"grep", "-vw", "bridge name"}},
        {makeGrep, {"grep", "-i", "Currently Active Slave: eth0"}},
        {makeGrep, {"grep", "eth0.1"}},
        {makeGrep, {"grep", "-w", "a"}},
        {makeGrep, {"grep", "a$"}},
        {makeGrep, {"grep", "-P", "a\\nb"}},
        {makeEgrep, {"egrep", "eth|bond|usb"}},
        {makeCut, {"cut", "-d", " ", "-f1"}},
        {makeCut, {"cut", "-d", " ", "-f4"}},
        {makeCut, {"cut", "-d:", "-f2"}},
        {makeCut, {"cut", "-d", "=", "-f2"}},
        {makeTr, {"tr", "-s", " "}},
        {makeTr, {"tr", "-s", "*", " "}},
        {makeTr, {"tr", "[A-Z]", "[a-z]"}},
        {makeAwk, {"awk", "{print $1}"}},
        {makeAwk, {"awk", "{print $5}"}},
        {makeAwk, {"awk", "{print $NF}"}},
        {makeMd5sum, {"md5sum"}},
        {makeSha1sum, {"sha1sum"}},
    };
    const std::vector<Stage> usual = all;
    for (const Stage& stage : usual) {
        for (const std::string program : {"/usr/bin/gawk", "/usr/bin/busybox"}) {
            const bool fits = stage.words.front() == "awk" || program == "/usr/bin/busybox";
            if (fits && access(program.c_str(), X_OK) == 0 &&
                stage.make(Words(stage.words).subspan(1), mannerOf(program)) != nullptr) {
                all.push_back({stage.make, stage.words, program});
            }
        }
    }
    return all;
}

const std::vector<Stage>& stages() {
    static const std::vector<Stage> all = makeStages();
    return all;
}

struct Answer {
    std::string out;
    int status = 0;
    bool operator==(const Answer&) const = default;
};

Answer ours(const Stage& stage, const std::string& input) {
    const auto filter = stage.make(Words(stage.words).subspan(1), mannerOf(stage.program));
    filter->readFrom(std::make_unique<TextSource>(input));
    Answer answer;
    while (filter->pull(answer.out)) {
    }
    answer.status = filter->status();
    return answer;
}

/// The fuzzer's own alarm may come at any time.
template <class Call>
auto uninterrupted(Call call) {
    auto result = call();
    while (result < 0 && errno == EINTR) {
        result = call();
    }
    return result;
}

/// The input fits into a pipe, so that it can be written before anybody reads.
Answer theirs(const Stage& stage, const std::string& input) {
    std::array<int, 2> in{};
    std::array<int, 2> out{};
    if (pipe2(in.data(), O_CLOEXEC) != 0 || pipe2(out.data(), O_CLOEXEC) != 0 ||
        write(in[1], input.data(), input.size()) != static_cast<ssize_t>(input.size())) {
        abort();
    }
    close(in[1]);
    posix_spawn_file_actions_t actions{};
    posix_spawn_file_actions_init(&actions);
    posix_spawn_file_actions_adddup2(&actions, in[0], STDIN_FILENO);
    posix_spawn_file_actions_adddup2(&actions, out[1], STDOUT_FILENO);
    posix_spawn_file_actions_addopen(&actions, STDERR_FILENO, "/dev/null", O_WRONLY, 0);
    std::vector<char*> words;
    for (const std::string& word : stage.words) {
        words.push_back(const_cast<char*>(word.c_str()));
    }
    words.push_back(nullptr);
    pid_t tool = -1;
    const char* const program = stage.program.empty() ? words.front() : stage.program.c_str();
    if (posix_spawnp(&tool, program, &actions, nullptr, words.data(), environ) != 0) {
        abort();
    }
    posix_spawn_file_actions_destroy(&actions);
    close(in[0]);
    close(out[1]);
    Answer answer;
    std::array<char, 65536> buffer{};
    const auto next = [&] { return read(out[0], buffer.data(), buffer.size()); };
    for (ssize_t got = 0; (got = uninterrupted(next)) > 0;) {
        answer.out.append(buffer.data(), static_cast<std::size_t>(got));
    }
    close(out[0]);
    int status = 0;
    uninterrupted([&] { return waitpid(tool, &status, 0); });
    answer.status = WEXITSTATUS(status);
    return answer;
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    if (size == 0) {
        return 0;
    }
    setenv("LC_ALL", "C", 1);
    const Stage& stage = stages()[data[0] % stages().size()];
    const std::string input(reinterpret_cast<const char*>(data) + 1, size - 1);
    if (ours(stage, input) != theirs(stage, input)) {
        std::fprintf(stderr, "not what %s prints\n", stage.words.front().c_str());
        abort();
    }
    return 0;
}
