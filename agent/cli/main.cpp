#include <array>
#include <exception>
#include <optional>
#include <string>
#include <vector>

#include "agent/cli/caller.h"
#include "agent/cli/command_line.h"
#include "agent/cli/commands/commands.h"
#include "agent/cli/print.h"
#include "agent/cli/session.h"
#include "agent/core/signals.h"

namespace {

using cvagent::Command;
using cvagent::ExitStatus;
using cvagent::Options;

using Question = ExitStatus (*)(cvagent::Session& session, const Options& options);

/// What needs an agent, in the order of Command; null for what does not.
constexpr std::array<Question, 7> kQuestions = {cvagent::commands::tree, cvagent::commands::get,
                                                cvagent::commands::set, cvagent::commands::watch};

ExitStatus run(Options& options, cvagent::WantMessages& wants) {
    const Question ask = options.verify ? cvagent::commands::verifyTree
                                        : kQuestions.at(static_cast<std::size_t>(options.command));
    if (ask != nullptr) {
        const cvagent::PreparedProcess process(cvagent::processSettings(options));
        cvagent::Session session(process, options, wants);
        return session.statusAfter(ask(session, options));
    }
    std::vector<std::string*> files;
    for (std::string& plugin : options.plugins) {
        files.push_back(&plugin);
    }
    cvagent::prepareSurroundings(files);
    return options.command == Command::doctor    ? cvagent::commands::doctor(options)
           : options.command == Command::history ? cvagent::commands::history(options)
                                                 : cvagent::commands::properties(options);
}

ExitStatus endWith(const cvagent::Failure& failure) {
    if (*failure.what() != '\0') {
        cvagent::complain(failure.what());
    }
    return failure.status();
}

ExitStatus runGuarded(Options& options, cvagent::WantMessages& wants) {
    try {
        cvagent::Style::detect();   // before the locale goes
        cvagent::rememberCaller();  // before the environment goes
        return run(options, wants);
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

/// What is not shown or not found can be what was wanting.
ExitStatus runAndJudge(Options& options) {
    cvagent::WantMessages wants;
    const ExitStatus status = runGuarded(options, wants);
    const bool ofHost = options.command != Command::properties && options.command != Command::history;
    const bool wanting = ofHost && wants.tell();
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
    cvagent::StopSignals::becomeWriteErrors();
    try {
        auto options = cvagent::parseCommandLine(count, words);
        return static_cast<int>(options ? runAndJudge(*options) : ExitStatus::done);
    } catch (const cvagent::Failure& failure) {
        return static_cast<int>(endWith(failure));
    }
}
