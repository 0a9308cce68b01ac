#include "framework/cvlog/logger.h"

#include <atomic>
#include <climits>
#include <mutex>
#include <shared_mutex>

namespace CVLog {
namespace {

constexpr int kErrorLevel = 6000;
constexpr int kOff = INT_MAX;

DescriptorSink& standardError() {
    // Never destroyed: other libraries log while they are being unloaded.
    static auto* const sink = new DescriptorSink(2);
    return *sink;
}

/// One of the two ways out. Constant initialisation and no destructor of its own, so that it serves from the
/// first static initialiser to the last thread.
class Channel {
public:
    constexpr Channel(int threshold, bool toStandardError)
        : threshold_(threshold), toStandardError_(toStandardError) {}

    bool wants(int level) const { return level >= threshold_.load(std::memory_order_relaxed); }

    void write(const LogRecord& record) {
        std::unique_lock turn(turn_);
        const std::shared_lock lock(guard_);
        turn.unlock();
        LogSink* const sink = toStandardError_ ? &standardError() : sink_;
        if (sink != nullptr) {
            sink->write(record);
        }
    }

    void replace(LogSink* sink, int threshold) {
        const std::lock_guard turn(turn_);
        const std::unique_lock lock(guard_);
        sink_ = sink;
        toStandardError_ = false;
        threshold_.store(sink != nullptr ? threshold : kOff, std::memory_order_relaxed);
    }

private:
    std::atomic<int> threshold_;
    std::mutex turn_;          // lets a replacement in between writers that never pause
    std::shared_mutex guard_;  // shared by writers; guards the two below
    bool toStandardError_;
    LogSink* sink_ = nullptr;
};

constinit Channel logChannel(kErrorLevel, true);
constinit Channel traceChannel(kOff, false);

void deliver(Channel& channel, const LogRecord& record) noexcept {
    try {
        channel.write(record);
    } catch (...) {
        // A log line that cannot be written must not stop the work it tells of.
    }
}

}  // namespace

LogSink::~LogSink() = default;

void CVLogger::logLevelMessage(const char* function, const char* source, int line,
                               const std::string& component, int level, char* reserved1, int reserved2,
                               int reserved3, const std::string& message) noexcept {
    if (logChannel.wants(level)) {
        deliver(logChannel,
                {function, source, line, component, level, reserved1, reserved2, reserved3, message});
    }
}

void CVLogger::traceLevelMessage(const char* function, const char* source, int line,
                                 const std::string& component, int level, char* reserved1, int reserved2,
                                 int reserved3, const std::string& message) noexcept {
    if (traceChannel.wants(level)) {
        deliver(traceChannel,
                {function, source, line, component, level, reserved1, reserved2, reserved3, message});
    }
}

void CVLogger::setLog(LogSink* sink, int threshold) {
    logChannel.replace(sink, threshold);
}

void CVLogger::setTrace(LogSink* sink, int threshold) {
    traceChannel.replace(sink, threshold);
}

}  // namespace CVLog
