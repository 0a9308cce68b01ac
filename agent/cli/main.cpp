#include <unistd.h>

#include <array>
#include <optional>
#include <string>
#include <vector>

#include "agent/cli/asking.h"
#include "agent/cli/caller.h"
#include "agent/cli/changes.h"
#include "agent/cli/command_line.h"
#include "agent/cli/commands/commands.h"
#include "agent/cli/guarded.h"
#include "agent/cli/local_session.h"
#include "agent/cli/print.h"
#include "agent/cli/remote/service.h"
#include "agent/core/signals.h"

namespace {

using cvagent::Command;
using cvagent::ExitStatus;
using cvagent::Options;

/// What needs an agent, in the order of Command; null for what does not.
constexpr std::array<cvagent::Question, 13> kQuestions = {
    cvagent::commands::tree,          cvagent::commands::get,  cvagent::commands::set,
    cvagent::commands::watch,         cvagent::commands::plan, cvagent::commands::apply,
    cvagent::commands::exportChanges, cvagent::commands::diff};

/// What a watch runs on alerts gets the surroundings that it has without a service.
void prepareToAsk(Options& options) {
    if (options.command == Command::watch) {
        cvagent::prepareSurroundings({&options.program});
    }
}

ExitStatus runWithoutAgent(const Options& options) {
    switch (options.command) {
        case Command::history:
            return options.listsChanges ? cvagent::commands::listChanges(options)
                                        : cvagent::commands::history(options);
        case Command::confirm:
            return cvagent::commands::confirmChange(options);
        case Command::rollback:
            return cvagent::commands::rollback(options);
        default:
            return cvagent::commands::properties(options);
    }
}

/// Who is not root has his changes kept and taken back by the service, which is found by the environment.
bool isForService(const Options& options) {
    return geteuid() != 0 && (options.command == Command::confirm || options.command == Command::rollback);
}

ExitStatus run(Options& options, cvagent::WantMessages& wants) {
    const cvagent::Question ask = options.verify ? cvagent::commands::verifyTree
                                                 : kQuestions.at(static_cast<std::size_t>(options.command));
    if (!options.changeFile.empty()) {
        options.changeText = cvagent::readChangeFile(options.changeFile);  // before the directory is left
    }
    if (ask != nullptr) {
        if (const auto status = cvagent::askService(ask, options, prepareToAsk)) {
            return *status;
        }
        const cvagent::PreparedProcess process(cvagent::processSettings(options));
        cvagent::LocalSession session(process, options, wants);
        return session.statusAfter(ask(session, options));
    }
    std::vector<std::string*> files;
    for (std::string& plugin : options.plugins) {
        files.push_back(&plugin);
    }
    const bool isDoctor = options.command == Command::doctor;
    const auto service = isDoctor ? cvagent::remote::describeService(options)  // before the environment goes
                                  : cvagent::remote::ServiceReport();
    if (!isForService(options)) {
        cvagent::prepareSurroundings(files);
    }
    return isDoctor ? cvagent::commands::doctor(options, service) : runWithoutAgent(options);
}

ExitStatus runGuarded(Options& options, cvagent::WantMessages& wants) {
    return cvagent::guarded([&] {
        cvagent::Style::detect();   // before the locale goes
        cvagent::rememberCaller();  // before the environment goes
        return run(options, wants);
    });
}

/// What is not shown or not found can be what was wanting.
ExitStatus runAndJudge(Options& options) {
    cvagent::WantMessages wants;
    const ExitStatus status = runGuarded(options, wants);
    const bool ofHost = options.command < Command::properties || options.command == Command::doctor;
    const bool wanting = ofHost && !options.byService && wants.tell();
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
        return static_cast<int>(cvagent::endWith(failure));
    }
}
