// What is started as cvagent where there can be a service: a program that is ready sooner than the whole one,
// which has the option parser, all commands and an agent, and loads the libraries that plug-ins share with
// it. A plain question that the service answers ends here; for all else the whole program takes its place.
#include <fcntl.h>
#include <unistd.h>

#include <cerrno>
#include <cstring>
#include <optional>
#include <string>

#include "agent/cli/asking.h"
#include "agent/cli/commands/commands.h"
#include "agent/cli/guarded.h"
#include "agent/cli/plain_question.h"
#include "agent/cli/print.h"
#include "agent/cli/want_messages.h"
#include "agent/core/program_path.h"
#include "agent/core/signals.h"
#include "agent/core/text.h"

namespace {

using cvagent::ExitStatus;
using cvagent::Options;

/// For a copy that lies elsewhere, too.
constexpr const char* kInstalled = CORVISTA_LIBEXECDIR "/cvagent";

/// What the whole program finds out about a descriptor that is closed, it has to find out itself.
bool hasStandardDescriptors() {
    return fcntl(STDIN_FILENO, F_GETFD) >= 0 && fcntl(STDOUT_FILENO, F_GETFD) >= 0 &&
           fcntl(STDERR_FILENO, F_GETFD) >= 0;
}

/// Nothing where there is no service: why, is the whole program's to tell.
std::optional<ExitStatus> answerOfService(Options& options) {
    std::optional<ExitStatus> answer;
    const ExitStatus status = cvagent::guarded([&] {
        cvagent::Style::detect();
        const bool ofNode = options.command == cvagent::Command::get;
        answer =
            cvagent::askService(ofNode ? cvagent::commands::get : cvagent::commands::tree, options, nullptr);
        return ExitStatus::done;
    });
    return status == ExitStatus::done ? answer : status;
}

std::string wholeProgram() {
    return cvagent::besideProgram({"../libexec"}, "cvagent").value_or(kInstalled);
}

ExitStatus becomeWhole(char** words) {
    const std::string whole = wholeProgram();
    execv(whole.c_str(), words);
    cvagent::complain("cannot run " + cvagent::inQuotes(whole) + ": " + std::strerror(errno));
    return ExitStatus::failed;
}

/// Before the tables of the program are made, which need memory.
[[gnu::constructor(101)]] void beforeEverything() {
    cvagent::failPlainlyWithoutMemory();
}

}  // namespace

int main(int count, char** words) {
    if (auto question = cvagent::plainQuestion(count, words); question && hasStandardDescriptors()) {
        cvagent::StopSignals::becomeWriteErrors();
        if (const auto status = answerOfService(*question)) {
            return static_cast<int>(*status);
        }
    }
    return static_cast<int>(becomeWhole(words));
}
