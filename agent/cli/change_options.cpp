#include <cmath>

#include "agent/cli/option_parts.h"
#include "agent/core/text.h"

namespace cvagent {

namespace {

constexpr const char* kFileHelp =
    "A file of changes as cvagent export writes it; - reads it from standard input";

constexpr double kLongestConfirmation = 86400;

/// One word is a file, more are a change.
void takePlanWords(Options& options) {
    if (options.words.size() == 1) {
        options.changeFile = options.words.front();
    } else if (options.words.size() >= 3) {
        options.node = options.words[0];
        options.property = options.words[1];
        options.values.assign(options.words.begin() + 2, options.words.end());
    } else {
        throw CLI::ParseError("a plan is of a file, or of a node, a property and a value",
                              CLI::ExitCodes::RequiredError);
    }
}

void addPlan(CLI::App& app, Options& options) {
    CLI::App* plan = app.add_subcommand(
        "plan", "Tell what a change would do: files, commands, the kernel's state; nothing is changed");
    plan->add_option("NODE PROPERTY VALUE... | FILE", options.words,
                     "A change as set takes it, or a file of changes as apply takes it")
        ->required()
        ->type_name("");
    addForce(*plan, options);
    addJson(*plan, options);
    plan->footer(
        "The plug-in itself makes the change, where it sees the host but cannot reach it.\n"
        "Put -- in front of values that begin with a minus and are no numbers.");
    plan->callback([&options] {
        options.command = Command::plan;
        takePlanWords(options);
    });
}

void addFile(CLI::App& command, Options& options) {
    command.add_option("FILE", options.changeFile, kFileHelp)
        ->required()
        ->type_name("")
        ->check(CLI::Validator(
            [](const std::string& name) { return name.empty() ? "no file is named" : std::string(); }, ""));
}

void addMadeChanges(CLI::App& app, Options& options) {
    CLI::App* confirm = app.add_subcommand("confirm", "Keep a change that is taken back otherwise");
    confirm->add_option("NUMBER", options.change, "Of the change, as apply or set has told it")
        ->required()
        ->type_name("")
        ->check(wholeDecimal());
    confirm
        ->add_option("--lengthen", options.confirmSeconds,
                     "Do not keep it yet, but let it wait for so long from now on")
        ->type_name("SECONDS")
        ->check(secondsUpTo(kLongestConfirmation));
    confirm->callback([&options] { options.command = Command::confirm; });

    CLI::App* rollback =
        app.add_subcommand("rollback", "Take a change back, as long as no newer one stands on it");
    rollback->add_option("NUMBER", options.change, "Of the change; the last one when none is named")
        ->type_name("")
        ->check(wholeDecimal());
    rollback->footer("The changes are listed by: cvagent history --changes.");
    rollback->callback([&options] { options.command = Command::rollback; });
}

}  // namespace

CLI::Validator wholeDecimal() {
    return CLI::Validator(
        [](const std::string& text) {
            const bool good = text.find_first_not_of("0123456789") == std::string::npos;
            return good ? std::string() : inQuotes(text) + " is no decimal number";
        },
        "");
}

CLI::Validator secondsUpTo(double most) {
    return CLI::Validator(
        [most](const std::string& text) {
            double seconds = 0;
            const bool good = !text.starts_with('+') &&
                              text.find_first_not_of("0123456789.eE+-") == std::string::npos &&
                              CLI::detail::lexical_cast(text, seconds) && seconds >= 0 && seconds <= most;
            return good ? std::string()
                        : inQuotes(text) + " is no number of seconds from 0 to " +
                              std::to_string(std::lround(most));
        },
        "");
}

void addJson(CLI::App& command, Options& options) {
    command.add_flag("--json", options.json, "Print JSON");
}

void addYes(CLI::App& command, Options& options) {
    command.add_flag("-y,--yes", options.yes, "Do not ask before the host is restarted or halted");
}

void addForce(CLI::App& command, Options& options) {
    command.add_flag("--force", options.force, "Do it although something speaks against it");
}

void addVerifyWithin(CLI::App& command, Options& options, const std::string& usual) {
    command
        .add_option("--verify-within", options.verifySeconds,
                    "Look so long whether what was written comes about, and stays. Default: " + usual)
        ->type_name("SECONDS")
        ->check(secondsUpTo(3600));
}

void addConfirmWithin(CLI::App& command, Options& options) {
    command
        .add_option(
            "--confirm-within", options.confirmSeconds,
            "Take all of it back unless somebody types cvagent confirm within this time, and when a step "
            "fails. 0: do not. Default: 60 where root, or who asks the service, could cut himself off at a "
            "terminal, else 0")
        ->type_name("SECONDS")
        ->check(secondsUpTo(kLongestConfirmation));
}

void addChanges(CLI::App& app, Options& options) {
    addPlan(app, options);
    CLI::App* apply =
        app.add_subcommand("apply", "Make the changes of a file, as far as they are not so already");
    addFile(*apply, options);
    addYes(*apply, options);
    addForce(*apply, options);
    addVerifyWithin(*apply, options, "3");
    addConfirmWithin(*apply, options);
    apply->add_flag("-n,--dry-run", options.dryRun, "Only tell the plan");
    addJson(*apply, options);
    apply->callback([&options] { options.command = Command::apply; });

    CLI::App* exported =
        app.add_subcommand("export", "Write a file of changes that sets this host back to what it is now");
    exported->add_option("NODE", options.nodes, "Only of these nodes")->type_name("");
    exported->callback([&options] { options.command = Command::exportChanges; });

    CLI::App* diff = app.add_subcommand(
        "diff", "Tell where the host differs from a file of changes; status 1 when it does");
    addFile(*diff, options);
    addJson(*diff, options);
    diff->callback([&options] { options.command = Command::diff; });
    addMadeChanges(app, options);
}

}  // namespace cvagent
