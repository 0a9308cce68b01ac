#include <exception>

#include "agent/command_line.h"
#include "agent/commands/commands.h"
#include "agent/print.h"
#include "agent/signals.h"

namespace {

using cvagent::Command;
using cvagent::ExitStatus;
using cvagent::Options;

ExitStatus run(const Options& options) {
    switch (options.command) {
        case Command::tree:
            return cvagent::commands::tree(options);
        case Command::get:
            return cvagent::commands::get(options);
        case Command::set:
            return cvagent::commands::set(options);
        case Command::watch:
            return cvagent::commands::watch(options);
        case Command::properties:
            return cvagent::commands::properties(options);
        case Command::doctor:
            return cvagent::commands::doctor(options);
    }
    return ExitStatus::usage;
}

int runGuarded(const Options& options) {
    cvagent::StopSignals::install();
    try {
        return static_cast<int>(run(options));
    } catch (const cvagent::Failure& failure) {
        if (*failure.what() != '\0') {
            cvagent::complain(failure.what());
        }
        return static_cast<int>(failure.status());
    } catch (const cvagent::Interrupted&) {
        cvagent::complain("nothing was done");
        cvagent::StopSignals::die();
    } catch (const std::exception& exception) {
        cvagent::complain(std::string("unexpected failure: ") + exception.what());
        return static_cast<int>(ExitStatus::failed);
    }
}

}  // namespace

int main(int count, char** words) {
    int status = 0;
    const auto options = cvagent::parseCommandLine(count, words, status);
    return options ? runGuarded(*options) : status;
}
