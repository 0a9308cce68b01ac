#pragma once

#include <memory>
#include <string>
#include <vector>

#include "agent/shell/child.h"
#include "agent/shell/programs.h"
#include "agent/shell/source.h"

namespace cvagent::shell {

/// How a start went.
struct Outcome {
    enum Kind {
        started,
        refused,  ///< for a shell to run; of a shell: there is none
        failed    ///< the system has no room for another process
    };
    Kind kind = started;
    int error = 0;  ///< of a failure
};

/// The first stage of a pipeline, running or ready to be read.
struct FirstStage {
    Outcome outcome;
    std::unique_ptr<Source> source = nullptr;
    ProcessSource* process = nullptr;  ///< the source again, when it is a process
};

struct FirstStageRequest {
    std::vector<std::string> words;
    bool silent = false;
    std::string command;  ///< the whole command line
    int output = -1;      ///< a descriptor that a process writes to; -1: it is read from here
    bool isRead = true;   ///< what is printed without a process is read here, or written to a file
};

/// Starts a tool, or stands in for it.
FirstStage startFirstStage(const FirstStageRequest& request, ProgramSearch& programs);

/// Starts a shell for a text.
/// @param argument its $1
FirstStage startShell(const FirstStageRequest& request, const std::string& text,
                      const std::string& argument = {});

/// Whether /dev/null is the device of that name.
bool nullDeviceIsThere();

}  // namespace cvagent::shell
