#pragma once

#include <memory>
#include <optional>
#include <string>

#include "agent/core/error_lines.h"

namespace cvagent {

constexpr int kErrorLevel = 6000;  ///< log lines from here up are errors

/// Where the plug-in's lines go.
struct LogSettings {
    std::optional<std::string> file;
    std::optional<std::string> traceFile;  ///< gets every line, whatever its level
    int lowest = kErrorLevel;              ///< level of the lines that are logged
    /// Without a file lines go where the program's own messages go, as they come, and the errors among them
    /// are not kept as well.
    bool shown = false;
    /// Of lines that were not asked for: a name that the plug-in refuses is shown once.
    bool advises = false;
    std::string advice;  ///< what is told behind that name
};

/// Where the plug-ins' log and trace lines go while this object lives. An error that is reported on the
/// thread of a call belongs to that call; the others, those of starts, monitors and stops, belong to
/// nobody's. Of several such objects the one that was made last gets the lines.
/// A name that the plug-in refuses to put into a command is among the errors once, with the advice.
class LogOutput {
public:
    /// @param unowned takes the errors that belong to no call. Throws Problem when a file cannot be opened.
    LogOutput(const LogSettings& settings, std::shared_ptr<ErrorLines> unowned);
    LogOutput(const LogOutput&) = delete;
    LogOutput& operator=(const LogOutput&) = delete;
    ~LogOutput();

private:
    class Sink;
    std::unique_ptr<Sink> log_;
    std::unique_ptr<Sink> trace_;
};

}  // namespace cvagent
