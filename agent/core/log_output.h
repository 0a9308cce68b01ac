#pragma once

#include <memory>
#include <string>
#include <vector>

#include "agent/cli/options.h"

namespace cvagent {

/// Where the plug-in's log and trace lines go while this object lives, and what it reported as errors.
class LogOutput {
public:
    /// @param live lines that no file was named for go to standard error as they come, not only the errors of
    ///             a call after it. Throws Failure when a file cannot be opened.
    LogOutput(const Options& options, bool live);
    LogOutput(const LogOutput&) = delete;
    LogOutput& operator=(const LogOutput&) = delete;
    ~LogOutput();

    /// The messages of level 6000 and up since the last call, unless they were shown already. A name that the
    /// plug-in refused to put into a command is among them once, with what to do about it.
    std::vector<std::string> takeErrors();
    /// Prints what takeErrors returns to standard error.
    void showErrors();

private:
    class Sink;
    std::unique_ptr<Sink> log_;
    std::unique_ptr<Sink> trace_;
};

}  // namespace cvagent
