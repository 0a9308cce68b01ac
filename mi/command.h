#pragma once

#include <cstddef>
#include <cstdio>
#include <optional>
#include <string>
#include <utility>

#include "mi/my_process.h"

namespace IC {

constexpr std::size_t kCommandBuffer =
    512;  ///< bytes of a command line and of a line read, the final zero included

/// The command line a format makes, or nothing when it would not fit its 512 bytes: then it is logged at
/// level 6000 and never run, since half a command is another command.
[[gnu::format(printf, 1, 2)]] std::optional<std::string> formatCommand(const char* format, ...);

constexpr std::size_t kMostOutput = 2UL << 20U;  ///< bytes that are read of one command's output

/// The lines of a command's output, as far as anybody wants to know: a tool that has gone mad can print for
/// ever. The rest is not read, which ends the command.
class OutputReader {
public:
    explicit OutputReader(std::string command) : command_(std::move(command)) {}
    std::optional<std::string> nextLine(FILE* pipe, std::size_t longest);

private:
    std::string command_;
    std::size_t left_ = kMostOutput;
};

/// One running shell command whose output is read line by line. The output ends, and the command is waited
/// for, when the object goes.
class HostCommand {
public:
    /// @param command what formatCommand gave; nothing counts as a command that could not be started
    explicit HostCommand(const std::optional<std::string>& command);
    /// Runs a text that was put together from pieces; the number of open pipes is logged.
    static HostCommand fromText(const std::string& command);
    HostCommand(const HostCommand&) = delete;
    HostCommand& operator=(const HostCommand&) = delete;

    bool started() const { return pipe_ != nullptr; }
    /// The next line as it came, its line break included: at most `longest` characters, the rest of a longer
    /// line comes with the next call. Nothing at the end of output, or when the command was not started.
    std::optional<std::string> nextLine(std::size_t longest = kCommandBuffer - 1);

private:
    struct FromText {};
    HostCommand(FromText, const std::string& command);

    MyProcess process_;
    OutputReader reader_;
    FILE* pipe_ = nullptr;
};

/// All that most queries take of a command.
struct FirstLine {
    bool started;                     ///< false when the command could not be run at all
    std::optional<std::string> line;  ///< as it came, its line break included; nothing when none was printed
};
FirstLine firstLine(HostCommand&& command);
FirstLine firstLine(const std::optional<std::string>& command);

/// A command read through a plain pipe: not counted among the open pipes.
class PlainCommand {
public:
    explicit PlainCommand(const std::optional<std::string>& command);
    PlainCommand(const PlainCommand&) = delete;
    PlainCommand& operator=(const PlainCommand&) = delete;
    ~PlainCommand();

    bool started() const { return pipe_ != nullptr; }
    std::optional<std::string> nextLine();

private:
    OutputReader reader_;
    FILE* pipe_ = nullptr;
};

/// Runs a command to its end, for what it does. Its exit status is not examined.
void runToEnd(const std::string& command);

}  // namespace IC
