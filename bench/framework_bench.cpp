// The framework's own cost: the property store, publishing, a log line that nobody reads.
#include <benchmark/benchmark.h>

#include "framework/cvlog/logger.h"
#include "framework/cvlog/message_buffer.h"
#include "framework/ic/management_interface.h"

namespace {

using IC::MutableNode;
using IC::PropertyValue;

constexpr unsigned int kProperties = 40;  // about what an IP configuration node holds

/// One node that all threads of a benchmark share.
MutableNode& sharedNode() {
    static MutableNode node(1, 0, {1}, 29, 0);
    static const bool filled = [] {
        for (unsigned int id = 0; id < kProperties; ++id) {
            node.setProperty(id, PropertyValue("192.168.100." + std::to_string(id), true));
        }
        return true;
    }();
    benchmark::DoNotOptimize(filled);
    return node;
}

void readProperty(benchmark::State& state) {
    const MutableNode& node = sharedNode();
    PropertyValue value;
    unsigned int id = 0;
    for ([[maybe_unused]] auto _ : state) {
        node.getProperty(id++ % kProperties, value);
        benchmark::DoNotOptimize(value);
    }
}
BENCHMARK(readProperty)->ThreadRange(1, 8)->UseRealTime();

void writeProperty(benchmark::State& state) {
    MutableNode& node = sharedNode();
    const PropertyValue value("10.0.0.1", true);
    unsigned int id = 0;
    for ([[maybe_unused]] auto _ : state) {
        node.setProperty(id++ % kProperties, value);
    }
}
BENCHMARK(writeProperty)->ThreadRange(1, 8)->UseRealTime();

void readAllProperties(benchmark::State& state) {
    const MutableNode& node = sharedNode();
    for ([[maybe_unused]] auto _ : state) {
        std::map<unsigned int, PropertyValue> values;
        node.getProperties(values);
        benchmark::DoNotOptimize(values);
    }
}
BENCHMARK(readAllProperties);

class Interface : public IC::ManagementInterface {
public:
    using ManagementInterface::appendNode;
};

/// Makes, publishes and withdraws one node in an interface that has that many others.
void publishAndWithdraw(benchmark::State& state) {
    Interface interface;
    const auto others = static_cast<unsigned int>(state.range(0));
    for (unsigned int id = 1; id <= others; ++id) {
        interface.appendNode(new MutableNode(id, 0, {1}, 11, id));
    }
    for ([[maybe_unused]] auto _ : state) {
        auto* const node = new MutableNode(others + 1, 0, {1}, 11, 0);
        interface.addNewNode(node);
        interface.deleteNode(node);
    }
}
BENCHMARK(publishAndWithdraw)->Arg(0)->Arg(100)->Arg(2000);

void holdNode(benchmark::State& state) {
    Interface interface;
    const auto count = static_cast<unsigned int>(state.range(0));
    for (unsigned int id = 1; id <= count; ++id) {
        interface.appendNode(new MutableNode(id, 0, {1}, 11, id));
    }
    for ([[maybe_unused]] auto _ : state) {
        benchmark::DoNotOptimize(interface.hold(count / 2));
    }
}
BENCHMARK(holdNode)->Arg(100)->Arg(2000);

const std::string kComponent = "Corvista.IC.MI.OsHwMI";

void logBoth(const std::string& message) {
    CVLog::CVLogger::logLevelMessage("bench", "OsHwMI_ix86", 1, kComponent, 3000, nullptr, 0, 0, message);
    CVLog::CVLogger::traceLevelMessage("bench", "OsHwMI_ix86", 1, kComponent, 3000, nullptr, 0, 0, message);
}

/// The two calls alone.
void logCallsWithSinksOff(benchmark::State& state) {
    CVLog::CVLogger::setLog(nullptr, 0);
    CVLog::CVLogger::setTrace(nullptr, 0);
    const std::string message = "initialize: entry";
    for ([[maybe_unused]] auto _ : state) {
        logBoth(message);
    }
}
BENCHMARK(logCallsWithSinksOff);

/// A whole line as the plug-in writes it: put together, then handed to both.
void logLineWithSinksOff(benchmark::State& state) {
    CVLog::CVLogger::setLog(nullptr, 0);
    CVLog::CVLogger::setTrace(nullptr, 0);
    for ([[maybe_unused]] auto _ : state) {
        CVLog::CVMessageBuffer buffer;
        buffer << "mypopen():  Count value " << 3;
        logBoth(buffer.str());
    }
}
BENCHMARK(logLineWithSinksOff);

}  // namespace
