#include <exception>

#include "agent/command_line.h"
#include "agent/commands/commands.h"
#include "agent/print.h"
#include "agent/signals.h"
#include "agent/surroundings.h"
#include "agent/want.h"

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

ExitStatus runGuarded(Options& options) {
    try {
        cvagent::prepareSurroundings(options);
        return run(options);
    } catch (const cvagent::Failure& failure) {
        if (*failure.what() != '\0') {
            cvagent::complain(failure.what());
        }
        return failure.status();
    } catch (const cvagent::Interrupted&) {
        cvagent::complain("nothing was done");
        cvagent::StopSignals::die();
    } catch (const std::exception& exception) {
        cvagent::complain(std::string("unexpected failure: ") + exception.what());
        return ExitStatus::failed;
    }
}

/// What is not shown or not found can be what was wanting.
ExitStatus judged(ExitStatus status, Command command) {
    const bool wanting = command != Command::properties && cvagent::tellWant(nullptr);
    const bool good = status == ExitStatus::done || status == ExitStatus::notFound;
    return wanting && good ? ExitStatus::failed : status;
}

/// Before the tables of the program are made, which need memory.
[[gnu::constructor(101)]] void beforeEverything() {
    cvagent::failPlainlyWithoutMemory();
}

}  // namespace

int main(int count, char** words) {
    cvagent::openStandardDescriptors();
    int status = 0;
    auto options = cvagent::parseCommandLine(count, words, status);
    return options ? static_cast<int>(judged(runGuarded(*options), options->command)) : status;
}
