#include <exception>
#include <optional>

#include "agent/cli/command_line.h"
#include "agent/cli/commands/commands.h"
#include "agent/cli/print.h"
#include "agent/cli/session.h"
#include "agent/core/signals.h"
#include "agent/core/surroundings.h"
#include "agent/core/want.h"

namespace {

using cvagent::Command;
using cvagent::ExitStatus;
using cvagent::Options;

using Question = ExitStatus (*)(cvagent::Session& session, const Options& options);

/// What needs an agent; null for what does not.
Question questionOf(Command command) {
    switch (command) {
        case Command::tree:
            return cvagent::commands::tree;
        case Command::get:
            return cvagent::commands::get;
        case Command::set:
            return cvagent::commands::set;
        case Command::watch:
            return cvagent::commands::watch;
        case Command::properties:
        case Command::doctor:
            break;
    }
    return nullptr;
}

ExitStatus run(const Options& options) {
    if (const Question ask = questionOf(options.command)) {
        cvagent::Session session(options);
        return session.statusAfter(ask(session, options));
    }
    return options.command == Command::doctor ? cvagent::commands::doctor(options)
                                              : cvagent::commands::properties(options);
}

ExitStatus endWith(const cvagent::Failure& failure) {
    if (*failure.what() != '\0') {
        cvagent::complain(failure.what());
    }
    return failure.status();
}

/// Files that the command line names; they are meant from where the program was started.
std::vector<std::string*> filesIn(Options& options) {
    std::vector<std::string*> files{&options.program};
    for (std::string& plugin : options.plugins) {
        files.push_back(&plugin);
    }
    for (std::optional<std::string>* file : {&options.logFile, &options.traceFile}) {
        if (*file) {
            files.push_back(&**file);
        }
    }
    return files;
}

ExitStatus runGuarded(Options& options) {
    try {
        cvagent::Style::detect();  // before the locale goes
        cvagent::prepareSurroundings(filesIn(options));
        return run(options);
    } catch (const cvagent::Failure& failure) {
        return endWith(failure);
    } catch (const cvagent::Problem& problem) {
        return endWith(cvagent::Failure(problem));
    } catch (const cvagent::Interrupted&) {
        cvagent::complain("nothing was done");
        cvagent::StopSignals::die();
    } catch (const std::exception& exception) {
        cvagent::complain(std::string("unexpected failure: ") + exception.what());
        return ExitStatus::failed;
    }
}

std::optional<Options> parsed(int count, char** words, int& status) {
    try {
        return cvagent::parseCommandLine(count, words, status);
    } catch (const cvagent::Failure& failure) {
        status = static_cast<int>(endWith(failure));
        return std::nullopt;
    }
}

/// What is not shown or not found can be what was wanting.
ExitStatus judged(ExitStatus status, Command command) {
    const bool wanting = command != Command::properties && cvagent::tellWant(nullptr, cvagent::complain);
    const bool good = status == ExitStatus::done || status == ExitStatus::notFound;
    return wanting && good ? ExitStatus::failed : status;
}

/// Before the tables of the program are made, which need memory.
[[gnu::constructor(101)]] void beforeEverything() {
    cvagent::failPlainlyWithoutMemory(static_cast<int>(ExitStatus::failed));
}

}  // namespace

int main(int count, char** words) {
    cvagent::openStandardDescriptors();
    cvagent::StopSignals::becomeWriteErrors();
    int status = 0;
    auto options = parsed(count, words, status);
    return options ? static_cast<int>(judged(runGuarded(*options), options->command)) : status;
}
