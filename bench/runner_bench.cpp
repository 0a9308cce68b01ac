// The command runner against a bare popen of the same command. The two take turns in one benchmark, so that
// whatever else the machine does meets both alike; "ratio" is the figure.
#include <benchmark/benchmark.h>

#include <array>
#include <chrono>
#include <cstdio>

#include "framework/cvlog/logger.h"
#include "mi/command.h"

namespace {

using Clock = std::chrono::steady_clock;

const std::array<IC::Command, 2> kCommands{
    "echo eth0 2> /dev/null",
    "cat /proc/net/dev 2> /dev/null | grep lo 2> /dev/null | tr -s ' ' 2> /dev/null | cut -d ' ' -f2 2> "
    "/dev/null",
};

void runBare(const IC::Command& command) {
    FILE* const pipe = popen(command.toRun(), "r");
    std::array<char, 512> line{};
    while (fgets(line.data(), line.size(), pipe) != nullptr) {
        benchmark::DoNotOptimize(line);
    }
    pclose(pipe);
}

void runWithRunner(const IC::Command& command) {
    IC::HostCommand running(command);
    while (auto line = running.nextLine()) {
        benchmark::DoNotOptimize(line);
    }
}

double seconds(void (*run)(const IC::Command&), const IC::Command& command) {
    const auto start = Clock::now();
    run(command);
    return std::chrono::duration<double>(Clock::now() - start).count();
}

void runnerAgainstBarePopen(benchmark::State& state) {
    CVLog::CVLogger::setLog(nullptr, 0);
    CVLog::CVLogger::setTrace(nullptr, 0);
    const IC::Command& command = kCommands.at(static_cast<std::size_t>(state.range(0)));
    double bare = 0;
    double runner = 0;
    bool bareFirst = true;
    for ([[maybe_unused]] auto _ : state) {
        if (bareFirst) {
            bare += seconds(runBare, command);
        }
        runner += seconds(runWithRunner, command);
        if (!bareFirst) {
            bare += seconds(runBare, command);
        }
        bareFirst = !bareFirst;
    }
    state.SetLabel(command.shown());
    state.counters["bare_us"] = benchmark::Counter(bare * 1e6, benchmark::Counter::kAvgIterations);
    state.counters["runner_us"] = benchmark::Counter(runner * 1e6, benchmark::Counter::kAvgIterations);
    state.counters["ratio"] = runner / bare;
}
BENCHMARK(runnerAgainstBarePopen)->DenseRange(0, kCommands.size() - 1)->UseRealTime()->MinTime(3);

}  // namespace
