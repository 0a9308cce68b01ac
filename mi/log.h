#pragma once

#include <concepts>
#include <exception>
#include <string>

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

extern const LogSource mainLogSource;  ///< "OsHwMI_ix86"

/// One log line: collects what is streamed into it and goes out at the end of the statement, first to the
/// log, then to the trace. Errors of a thread that is being aborted go nowhere. Never throws.
class LogLine {
public:
    LogLine(const LogSource& source, int level, const char* function, int line)
        : source_(source), level_(level), function_(function), line_(line) {}
    LogLine(const LogLine&) = delete;
    LogLine& operator=(const LogLine&) = delete;
    ~LogLine();

    template <class T>
    LogLine& operator<<(const T& value) noexcept {
        try {
            buffer_ << value;
        } catch (...) {
            // What finds no memory is missing in the line: the work itself goes on.
        }
        return *this;
    }

private:
    const LogSource& source_;
    int level_;
    const char* function_;
    int line_;
    CVLog::CVMessageBuffer buffer_;
};

/// Names the operation that runs on this thread until the scope is left: its log lines carry that name,
/// whichever helper, template or closure writes them, for that is the name readers of the log look up. A
/// LogScope does it by itself; an operation without one that logs needs this.
class Operation {
public:
    explicit Operation(const char* function = __builtin_FUNCTION());
    Operation(const Operation&) = delete;
    Operation& operator=(const Operation&) = delete;
    ~Operation();

    /// The innermost operation of this thread; `function` outside all of them.
    static const char* nameOr(const char* function);

private:
    const char* outer_;
};

/// A line of the main source. The last two arguments are the caller's function name and line: leave them out.
inline LogLine log(int level, const char* function = __builtin_FUNCTION(), int line = __builtin_LINE()) {
    return {mainLogSource, level, Operation::nameOr(function), line};
}

/// Runs one step of several; an exception is logged under the step's name and goes no further.
template <class Work>
void guarded(const char* name, Work work) {
    try {
        work();
    } catch (const std::exception& failure) {
        log(kError) << name << " failed: " << failure.what();
    } catch (...) {
        log(kError) << name << " failed: unknown exception";
    }
}

/// The calling thread's lines go nowhere from now on.
void endLogOfThisThread();

/// The class whose member a LogScope is for.
struct ClassName {
    const char* text;
};

/// Writes "<name>: entry" now and "<name>: exit" when the scope is left. Without a name it takes the
/// function's.
class LogScope {
public:
    explicit LogScope(const char* name = nullptr, const LogSource& source = mainLogSource,
                      const char* function = __builtin_FUNCTION(), int line = __builtin_LINE());
    /// For functions with words of their own ("Entering getNICTeams", "Exiting getNICTeams"): the whole
    /// texts.
    LogScope(const char* entry, const char* exit, const LogSource& source = mainLogSource,
             const char* function = __builtin_FUNCTION(), int line = __builtin_LINE());
    /// For the members of a class: the name is "<class>::<function>".
    LogScope(ClassName owner, const char* function, int line);
    LogScope(const LogScope&) = delete;
    LogScope& operator=(const LogScope&) = delete;
    ~LogScope();

private:
    /// @param end what follows the text
    void write(const char* text, const char* end) const;

    const char* owner_ = nullptr;
    const char* exit_;
    const char* exitEnd_;
    const LogSource& source_;
    const char* function_;
    int line_;
    Operation operation_;
};

}  // namespace IC
