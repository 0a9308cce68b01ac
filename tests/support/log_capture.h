#pragma once

#include <gtest/gtest.h>

#include <string>
#include <thread>
#include <vector>

#include "framework/cvlog/logger.h"

/// One call of the logger with its nine arguments.
struct LogLine {
    enum class Channel { log, trace };

    Channel channel;
    std::thread::id thread;
    std::string function;
    std::string source;
    int line;
    std::string component;
    int level;
    bool reserved1Null;
    int reserved2;
    int reserved3;
    std::string message;

    bool sameArguments(const LogLine& other) const;
};

/// While it lives, keeps every line of log and trace, from the lowest level up, in the order of the calls;
/// nothing reaches standard error. One at a time. At its end the logger is as at the start of a program.
class LogCapture {
public:
    LogCapture();
    ~LogCapture();
    LogCapture(const LogCapture&) = delete;
    LogCapture& operator=(const LogCapture&) = delete;

    std::vector<LogLine> lines() const;         ///< log and trace
    std::vector<std::string> messages() const;  ///< of the log
    std::vector<std::string> messages(int level) const;
    /// The same of what the calling thread logged, whatever the monitors say meanwhile.
    std::vector<LogLine> ownLines() const;
    std::vector<std::string> ownMessages() const;
    std::vector<std::string> ownMessages(int level) const;
    void clear();

    /// Holds when in every thread each line went to the log and right after it, unchanged, to the trace.
    testing::AssertionResult everyLineTwice() const;

private:
    struct Store;
    class Sink;
    Store* store_;
};
