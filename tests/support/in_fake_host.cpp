#include <fcntl.h>
#include <poll.h>
#include <sys/wait.h>
#include <unistd.h>

#include <array>
#include <csignal>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <iostream>

#include "tests/support/fake_host.h"
#include "tests/support/report.h"
#include "tests/support/system_call.h"
#include "tests/support/world.h"

using namespace fake_host;
using namespace std::chrono;

namespace {

/// Hands the child's failed assertions to the test that waits outside, in place of printing them.
class Relay : public testing::EmptyTestEventListener {
public:
    explicit Relay(int pipe) : pipe_(pipe) {}
    void OnTestPartResult(const testing::TestPartResult& result) override {
        if (result.passed()) return;
        failed_ |= result.failed();
        std::fflush(nullptr);
        send(pipe_, {Report::assertion, result.type(), result.line_number(),
                     result.file_name() ? result.file_name() : "", result.message()});
    }
    bool failed() const { return failed_; }

private:
    int pipe_;
    bool failed_ = false;
};

Relay& installRelay(int pipe) {
    auto& listeners = testing::UnitTest::GetInstance()->listeners();
    delete listeners.Release(listeners.default_result_printer());
    auto* relay = new Relay(pipe);
    listeners.Append(relay);
    return *relay;
}

bool startsWithAny(const char* text, std::initializer_list<const char*> beginnings) {
    for (const char* beginning : beginnings)
        if (std::strncmp(text, beginning, std::strlen(beginning)) == 0) return true;
    return false;
}

// The machine's time zone, language and the developer's own settings are not the fake host's.
void cleanEnvironment() {
    std::vector<std::string> unwanted;
    for (char** at = environ; *at; ++at)
        if (!startsWithAny(*at, {"ASAN_OPTIONS=", "LSAN_OPTIONS=", "UBSAN_OPTIONS=", "TSAN_OPTIONS=",
                                 "GTEST_", "GCOV_", "TERM=", "CORVISTA_TEST_"}))
            unwanted.emplace_back(*at, std::strcspn(*at, "="));
    for (const std::string& name : unwanted) unsetenv(name.c_str());
    setenv("PATH", "/tools:/usr/sbin:/usr/bin:/sbin:/bin", 1);
    setenv("HOME", "/root", 1);
}

void takeNullForInput() {
    int null = open("/dev/null", O_RDONLY | O_CLOEXEC);
    dup2(null, STDIN_FILENO);
    close(null);
}

void runBody(const std::function<void(FakeHost&)>& body) {
    try {
        FakeHost host;
        body(host);
    } catch (const std::exception& error) {
        ADD_FAILURE() << "the body threw: " << error.what();
    } catch (...) {
        ADD_FAILURE() << "the body threw something that is no std::exception";
    }
}

[[noreturn]] void runChild(int pipe, const std::function<void(FakeHost&)>& body) {
    Relay& relay = installRelay(pipe);
    cleanEnvironment();
    takeNullForInput();
    runBody(body);
    send(pipe, {Report::finished, 0, 0, "", ""});
    std::exit(relay.failed() ? 1 : 0);
}

/// What has come out of a fake host so far.
struct Outcome {
    bool failed = false;    // a failure has been passed on
    bool finished = false;  // the body ran to its end
    bool ended = false;
    int status = 0;
    bool outOfTime = false;
};

void passOn(const Report& report, Outcome& outcome) {
    switch (report.kind) {
        case Report::assertion:
            if (report.number == testing::TestPartResult::kSkip) GTEST_SKIP() << report.text;
            outcome.failed = true;
            ADD_FAILURE_AT(report.file.c_str(), report.line) << report.text;
            return;
        case Report::problem:
            outcome.failed = true;
            ADD_FAILURE() << "the fake host could not be built: " << report.text;
            return;
        case Report::finished:
            outcome.finished = true;
            return;
        case Report::ended:
            outcome.ended = true;
            outcome.status = report.number;
    }
}

Outcome collect(int pipe, seconds limit) {
    Outcome outcome;
    ReportReader reader;
    const auto end = steady_clock::now() + limit;
    std::array<char, 4096> block;
    for (;;) {
        auto left = duration_cast<milliseconds>(end - steady_clock::now()).count();
        pollfd ready{pipe, POLLIN, 0};
        int count = left > 0 ? poll(&ready, 1, static_cast<int>(left)) : 0;
        if (count < 0 && errno == EINTR) continue;
        outcome.outOfTime = count <= 0;
        if (outcome.outOfTime) return outcome;
        ssize_t got = read(pipe, block.data(), block.size());
        if (got <= 0) return outcome;
        reader.append(block.data(), static_cast<size_t>(got));
        while (auto report = reader.next()) passOn(*report, outcome);
        if (outcome.ended) return outcome;
    }
}

void judge(const Outcome& outcome, seconds limit) {
    if (outcome.outOfTime)
        ADD_FAILURE() << "the body on the fake host did not end within " << limit.count() << " s";
    else if (!outcome.ended && !outcome.failed)
        ADD_FAILURE() << "the fake host ended before its body";
    else if (WIFSIGNALED(outcome.status))
        ADD_FAILURE() << "the body on the fake host was ended by signal " << WTERMSIG(outcome.status) << ", "
                      << strsignal(WTERMSIG(outcome.status));
    else if (WEXITSTATUS(outcome.status) != 0 && !(outcome.failed && WEXITSTATUS(outcome.status) == 1))
        ADD_FAILURE() << "the body on the fake host left with status " << WEXITSTATUS(outcome.status)
                      << " (1: address, 23: leak, 66: thread sanitizer; see its output above)";
    else if (!outcome.finished && !outcome.failed)
        ADD_FAILURE() << "the body on the fake host left the program before its end";
}

}  // namespace

std::string buildDirectory() {
    return CORVISTA_BUILD_DIRECTORY;
}

std::string testsDirectory() {
    return CORVISTA_TESTS_DIRECTORY;
}

seconds bodyLimit() {
    const char* text = std::getenv("CORVISTA_TEST_SECONDS");
    return seconds(text ? std::atoi(text) : 900);
}

void inFakeHost(const std::function<void(FakeHost&)>& body, seconds limit) {
    int ends[2];
    must(pipe2(ends, O_CLOEXEC), "make a pipe");
    std::cout.flush();
    std::fflush(nullptr);
    pid_t world = startWorld(ends[1], [&] {
        close(ends[0]);
        runChild(ends[1], body);
    });
    close(ends[1]);
    Outcome outcome = collect(ends[0], limit);
    close(ends[0]);
    if (!outcome.ended) kill(world, SIGKILL);
    waitpid(world, nullptr, 0);
    judge(outcome, limit);
}
