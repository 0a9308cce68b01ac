#pragma once

#include <concepts>
#include <source_location>
#include <string>
#include <string_view>

#include "framework/cvlog/message_buffer.h"
#include "framework/ic/error.h"
#include "framework/ic/property_value.h"

namespace CVLog {

/// The framework types a log line can hold beside texts and numbers: printed by way of their stream output.
template <class T>
concept Printable = std::same_as<T, unsigned long long> || std::same_as<T, IC::PropertyValue> ||
    std::same_as<T, IC::EnumValue> || std::same_as<T, IC::Error>;

template <Printable T>
CVMessageBuffer& operator<<(CVMessageBuffer& buffer, const T& value) {
    static_cast<std::ostream&>(buffer) << value;
    return buffer;
}

}  // namespace CVLog

namespace IC {

// Levels of log lines.
constexpr int kProgress = 3000;  ///< entry, exit and progress
constexpr int kChange = 4000;    ///< detail of a change made to the host
constexpr int kNoAnswer = 5000;  ///< a framework call that returned nothing
constexpr int kError = 6000;     ///< a command or file that failed, an unexpected format

/// What a line says of where it comes from: the source's name and the logger component.
struct LogSource {
    const char* name;
    const std::string* component;
};

extern const LogSource mainLogSource;         ///< "OsHwMI_ix86"
extern const LogSource indicationsLogSource;  ///< "OsHwMIInd_ix86"
extern const LogSource processorsLogSource;   ///< "OsHwMICpu_ix86"

/// One log line: collects what is streamed into it and goes out at the end of the statement, first to the
/// log, then to the trace. Never throws.
class LogLine {
public:
    LogLine(const LogSource& source, int level, const std::source_location& where)
        : source_(source), level_(level), where_(where) {}
    LogLine(const LogLine&) = delete;
    LogLine& operator=(const LogLine&) = delete;
    ~LogLine();

    template <class T>
    LogLine& operator<<(const T& value) {
        buffer_ << value;
        return *this;
    }

private:
    const LogSource& source_;
    int level_;
    std::source_location where_;
    CVLog::CVMessageBuffer buffer_;
};

inline LogLine log(int level, const std::source_location& where = std::source_location::current()) {
    return {mainLogSource, level, where};
}
inline LogLine logInd(int level, const std::source_location& where = std::source_location::current()) {
    return {indicationsLogSource, level, where};
}
inline LogLine logCpu(int level, const std::source_location& where = std::source_location::current()) {
    return {processorsLogSource, level, where};
}

/// Writes "<name>: entry" now and "<name>: exit" when the scope is left. Without a name it takes the
/// function's.
class LogScope {
public:
    explicit LogScope(std::string name = {}, const LogSource& source = mainLogSource,
                      const std::source_location& where = std::source_location::current());
    LogScope(const LogScope&) = delete;
    LogScope& operator=(const LogScope&) = delete;
    ~LogScope();

private:
    std::string name_;
    const LogSource& source_;
    std::source_location where_;
};

/// The bare function name in a compiler's full signature: "initialize" of "IC::Error
/// IC::OsHwMI::initialize(…)".
std::string_view bareFunctionName(std::string_view signature);

}  // namespace IC
