#pragma once

#include <array>
#include <cstddef>
#include <cstdio>
#include <optional>
#include <span>
#include <string>
#include <string_view>
#include <utility>

#include "mi/command_format.h"
#include "mi/my_process.h"

namespace IC {

constexpr std::size_t kCommandBuffer =
    512;  ///< bytes of a command line and of a line read, the final zero included

/// A command that may be run: a constant of the source, or a format of the source whose texts the gate has
/// checked. There is no other way to make one.
///
/// The gate keeps every text of the host or of a caller from being more than a text to the shell. Line breaks
/// at its end and blanks at both ends are not looked at. Outside quotes a text may hold letters, digits,
/// bytes above 127 and ._:@%+=,/- and may not begin with "-". Between double quotes it may hold anything but
/// ", $, `, \ and control characters other than tabs and line breaks. The empty text passes. A text is put in
/// unchanged, except that outside quotes, with more of the command behind it, the line breaks at its end are
/// cut.
class Command {
public:
    enum class Length {
        ofBuffer,  ///< refused when it does not fit kCommandBuffer
        any,
    };

    template <std::size_t size>
    consteval Command(const char (&text)[size]) : fixed_(text) {}
    template <std::size_t count>
    Command(const CommandFormat<count>& format, const std::array<std::string_view, count>& texts,
            Length length, const char* function)
        : Command(format.format(), format.slots(), texts, length, function) {}

    /// Null when it was refused; then it counts as a command that could not be started.
    const char* toRun() const;
    /// For messages: one that was refused with its control characters spelt out.
    std::string shown() const;

private:
    using Slots = std::span<const TextSlot>;
    using Texts = std::span<const std::string_view>;
    Command(std::string_view format, Slots slots, Texts texts, Length length, const char* function);

    const char* fixed_ = nullptr;
    std::optional<std::string> made_;
    bool refused_ = false;
};

/// The command that a format of the source makes with these texts. One that the gate refuses, or that would
/// not fit its 512 bytes, is named at level 6000 and never run: half a command is another command.
template <class... Texts>
Command formatCommand(CommandFormat<sizeof...(Texts)> format, const Texts&... texts) {
    return {format, std::array<std::string_view, sizeof...(Texts)>{texts...}, Command::Length::ofBuffer,
            __func__};
}
/// The same for a command that is handed over as a string: it may be as long as it likes.
template <class... Texts>
Command textCommand(CommandFormat<sizeof...(Texts)> format, const Texts&... texts) {
    return {format, std::array<std::string_view, sizeof...(Texts)>{texts...}, Command::Length::any, __func__};
}

constexpr std::size_t kMostOutput = 64UL << 20U;  ///< bytes that are read of one command's output

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
    explicit HostCommand(const Command& command);
    /// Runs a command that is handed over as a string; the number of open pipes is logged.
    static HostCommand fromText(const Command& command);
    HostCommand(const HostCommand&) = delete;
    HostCommand& operator=(const HostCommand&) = delete;

    bool started() const { return pipe_ != nullptr; }
    /// The next line as it came, its line break included: at most `longest` characters, the rest of a longer
    /// line comes with the next call. Nothing at the end of output, or when the command was not started.
    std::optional<std::string> nextLine(std::size_t longest = kCommandBuffer - 1);

private:
    struct FromText {};
    HostCommand(FromText, const Command& command);

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
FirstLine firstLine(const Command& command);

/// A command read through a plain pipe: not counted among the open pipes.
class PlainCommand {
public:
    explicit PlainCommand(const Command& command);
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
void runToEnd(const Command& command);

}  // namespace IC
