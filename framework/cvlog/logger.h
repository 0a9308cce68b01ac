#pragma once

#include <cstdint>
#include <string>
#include <string_view>

#include "framework/export.h"

namespace CVLog {

/// One line on its way to the log or the trace, with the arguments it was given.
struct LogRecord {
    const char* function;
    const char* source;
    int line;
    const std::string& component;
    int level;
    const char* reserved1;
    int reserved2;
    int reserved3;
    const std::string& message;
};

/// Where lines end up. write may be called from many threads at once; it must not log itself. What it throws
/// is lost.
class CORVISTA_API LogSink {
public:
    virtual ~LogSink();
    virtual void write(const LogRecord& record) = 0;
};

/// The agent's logger. A line goes to a sink when its level is at least the sink's threshold; with both sinks
/// off a call costs two comparisons. Never throws; any thread.
class CORVISTA_API CVLogger {
public:
    static void logLevelMessage(const char* function, const char* source, int line,
                                const std::string& component, int level, char* reserved1, int reserved2,
                                int reserved3, const std::string& message) noexcept;
    static void traceLevelMessage(const char* function, const char* source, int line,
                                  const std::string& component, int level, char* reserved1, int reserved2,
                                  int reserved3, const std::string& message) noexcept;

    /// Replaces a sink; null switches it off. Returns when no thread writes to the old one any more.
    /// At the start the log writes to standard error from level 6000 up and the trace is off.
    static void setLog(LogSink* sink, int threshold);
    static void setTrace(LogSink* sink, int threshold);
};

/// A sink that appends lines to a file descriptor: time, thread, level, component, source:line, function,
/// message; a line break inside a message is written as "\n" so that a record stays one line.
class CORVISTA_API DescriptorSink : public LogSink {
public:
    explicit DescriptorSink(int descriptor) : descriptor_(descriptor) {}
    ~DescriptorSink() override;
    void write(const LogRecord& record) override;

private:
    int descriptor_;  // not owned
};

/// The text of a record as DescriptorSink writes it, without the line break.
CORVISTA_API std::string formatRecord(const LogRecord& record);

}  // namespace CVLog
