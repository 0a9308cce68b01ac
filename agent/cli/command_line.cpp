#include "agent/cli/command_line.h"

#include <CLI/CLI.hpp>
#include <algorithm>
#include <array>
#include <sstream>

#include "agent/cli/failure.h"
#include "agent/cli/moment.h"
#include "agent/cli/option_parts.h"
#include "agent/cli/plain_question.h"
#include "agent/cli/print.h"

namespace cvagent {

namespace {

constexpr const char* kDescription =
    "Shows and changes what the Corvista OS/hardware plug-in knows of this host.\n";
constexpr const char* kFooter =
    "\nExit status: 0 done, 1 the plug-in or the host failed, 2 wrong usage, 3 no such node or property,\n"
    "4 value refused, or not allowed, 5 another agent holds the data directory, or too much is asked at "
    "once.\n"
    "\nExamples:\n"
    "  cvagent tree\n"
    "  cvagent get network-port:eth0 LinkSpeed LinkState\n"
    "  cvagent set ip-config:eth0 DNSServers 192.0.2.53 2001:db8::53\n"
    "  cvagent COMMAND --help";
constexpr const char* kNodeHelp =
    "The node: its id, its path, or the last part of its path when only one node has it; of several "
    "plug-ins' "
    "nodes the first plug-in's";

/// The words of an enumeration, and nothing else.
template <class Value>
CLI::Validator oneOf(const std::map<std::string, Value>& words) {
    return CLI::Validator(
        [words](std::string& text) {
            if (const auto found = words.find(text); found != words.end()) {
                text = std::to_string(static_cast<int>(found->second));
                return std::string();
            }
            std::string list;
            for (const auto& [word, value] : words) {
                list += (list.empty() ? "" : ", ") + word;
            }
            return inQuotes(text) + " is none of: " + list;
        },
        "");
}

// What an agent of this process is told; the service has its own.
constexpr std::array kOwnOptions = {"--plugin",     "--log",      "--log-level",      "--trace",
                                    "--host-tools", "--commands", "--command-timeout"};

CLI::Validator busAddress() {
    return CLI::Validator(
        [](const std::string& text) {
            const bool good = text == "none" || text == "system" || text.starts_with("unix:");
            return good ? std::string() : inQuotes(text) + " is none of: none, system, unix:path=FILE";
        },
        "");
}

void addAgentOptions(CLI::App& app, Options& options) {
    app.add_option("--bus", options.bus,
                   "Where to ask the service: on the system's bus (system, the default), at another bus's "
                   "address, or not at all (none). Without a service, and with any of the options below, "
                   "this program is the agent itself")
        ->type_name("none|system|ADDRESS")
        ->check(busAddress());
    app.add_option("--plugin", options.plugins,
                   "The plug-in to load, in place of all those beside this program. Several may be given")
        ->type_name("FILE")
        ->expected(1)
        ->allow_extra_args(false)
        ->multi_option_policy(CLI::MultiOptionPolicy::TakeAll);
    app.add_option("--log", options.logFile, "Append the plug-in's log lines to this file")
        ->type_name("FILE");
    app.add_option(
           "--log-level", options.logLevel,
           "Lowest level of the lines that are logged (3000 progress, 4000 changes, 5000, 6000 errors); "
           "without --log they go to standard error. Default: 6000")
        ->type_name("N")
        ->check(wholeDecimal())
        ->check(CLI::Range(0, 1000000));
    app.add_option("--trace", options.traceFile, "Append every line, whatever its level, to this file")
        ->type_name("FILE");
}

void addCommandOptions(CLI::App& app, Options& options) {
    const std::map<std::string, HostTools> choices{
        {"auto", HostTools::automatic}, {"native", HostTools::native}, {"classic", HostTools::classic}};
    app.add_option(
           "--host-tools", options.hostTools,
           "Tools the plug-in's commands find: the host's own (native), our adapters (classic), or of "
           "each the one that prints the classic format (auto, the default)")
        ->type_name("auto|native|classic")
        ->transform(oneOf(choices));
    const std::map<std::string, Commands> ways{{"direct", Commands::direct}, {"shell", Commands::shell}};
    app.add_option("--commands", options.commands,
                   "How the plug-in's commands are run: without a shell where that makes no difference "
                   "(direct, the default), or all by /bin/sh (shell)")
        ->type_name("direct|shell")
        ->transform(oneOf(ways));
    app.add_option("--command-timeout", options.commandSeconds,
                   "End a command of the plug-in that takes longer, in a write ten times as long; what it "
                   "would have told reads as an error. 0 waits for ever. Default: 10")
        ->type_name("SECONDS")
        ->check(secondsUpTo(1e6));
}

// The parser would take a word in brackets apart ("[a,b]"); a mark in front keeps it whole.
constexpr char kMark = '\x01';

std::vector<std::string> marked(int count, const char* const* words) {
    std::vector<std::string> all;
    for (int i = count - 1; i > 0; --i) {  // the parser takes them from the back
        const std::string word = words[i];
        all.push_back(word.starts_with('[') || word.starts_with(kMark) ? kMark + word : word);
    }
    return all;
}

void unmark(std::string& word) {
    if (word.starts_with(kMark)) {
        word.erase(0, 1);
    }
}

void unmark(Options& options) {
    for (std::vector<std::string>* list :
         {&options.values, &options.properties, &options.plugins, &options.kinds, &options.nodes}) {
        for (std::string& word : *list) {
            unmark(word);
        }
    }
    for (std::string* word : {&options.node, &options.property, &options.nodeClass, &options.program,
                              &options.since, &options.until, &options.changeFile}) {
        unmark(*word);
    }
    for (std::optional<std::string>* file : {&options.logFile, &options.traceFile}) {
        if (*file) {
            unmark(**file);
        }
    }
}

void addReaders(CLI::App& app, Options& options) {
    CLI::App* tree = app.add_subcommand("tree", "Print the nodes as a tree");
    addJson(*tree, options);
    tree->footer("With --json every node is printed with its stored properties.");
    tree->callback([&options] { options.command = Command::tree; });

    CLI::App* get = app.add_subcommand("get", "Read a node's properties now");
    get->add_option("NODE", options.node, kNodeHelp)->required()->type_name("");
    get->add_option("PROPERTY", options.properties,
                    "Numbers or names of properties; all known ones when none is named")
        ->type_name("");
    addJson(*get, options);
    get->callback([&options] { options.command = Command::get; });
}

void addWatch(CLI::App& app, Options& options) {
    CLI::App* watch = app.add_subcommand("watch", "Print alerts, published and withdrawn nodes as they come");
    watch->add_option("--for", options.seconds, "Stop after this time; by default at Ctrl-C")
        ->type_name("SECONDS")
        ->check(secondsUpTo(1e9));
    watch
        ->add_option("--exec", options.program,
                     "Run this program on each alert, one at a time, with the event as JSON on its standard "
                     "input")
        ->type_name("PROGRAM")
        ->check(CLI::Validator(
            [](const std::string& name) { return name.empty() ? "no program is named" : std::string(); },
            ""));
    watch
        ->add_option("--exec-timeout", options.programSeconds,
                     "End the program, with what it has started, when it takes longer. Default: 30")
        ->type_name("SECONDS")
        ->check(secondsUpTo(86400))
        ->check(CLI::Validator(
            [](const std::string& seconds) {
                double time = 0;
                const bool some = CLI::detail::lexical_cast(seconds, time) && time > 0;
                return some ? std::string() : inQuotes(seconds) + " leaves the program no time";
            },
            ""));
    addJson(*watch, options);
    watch->footer("With --json each event is one object on a line of its own.");
    watch->callback([&options] { options.command = Command::watch; });
}

void addSet(CLI::App& app, Options& options) {
    CLI::App* set =
        app.add_subcommand("set", "Change a property of this host, then print what it was and is");
    set->add_option("NODE", options.node, kNodeHelp)->required()->type_name("");
    set->add_option("PROPERTY", options.property, "Number or name of the property")
        ->required()
        ->type_name("");
    set->add_option("VALUE", options.values, "The new value; several for a list, \"\" empties it")
        ->required()
        ->type_name("");
    addYes(*set, options);
    addForce(*set, options);
    addVerifyWithin(*set, options, "0");
    addConfirmWithin(*set, options);
    addJson(*set, options);
    set->footer(
        "What a property accepts is told by: cvagent properties CLASS.\n"
        "Put -- in front of values that begin with a minus and are no numbers.");
    set->callback([&options] { options.command = Command::set; });
}

void addOffline(CLI::App& app, Options& options) {
    CLI::App* properties = app.add_subcommand("properties", "Print the catalogue of properties");
    properties->add_option("CLASS", options.nodeClass, "Only this class of nodes, such as network-port")
        ->type_name("");
    addJson(*properties, options);
    properties->callback([&options] { options.command = Command::properties; });

    CLI::App* doctor =
        app.add_subcommand("doctor", "Tell which of the host's tools are found, used and missing");
    doctor->add_flag("--verify", options.verify,
                     "Compare the tree with what the kernel says now; status 1 when they differ");
    addJson(*doctor, options);
    doctor->callback([&options] { options.command = Command::doctor; });
}

/// What a check of one word says of it.
CLI::Validator checked(const std::function<std::string(const std::string&)>& problemOf) {
    return CLI::Validator([problemOf](const std::string& text) { return problemOf(text); }, "");
}

void addHistory(CLI::App& app, Options& options) {
    CLI::App* history =
        app.add_subcommand("history", "Print what has happened: alerts, nodes that came and went, writes");
    history->add_option("--since", options.since, "Only what came then or later, or behind this number")
        ->type_name("TIME|NUMBER")
        ->check(checked(problemOfMoment));
    history->add_option("--until", options.until, "Only what came until then, or up to this number")
        ->type_name("TIME|NUMBER")
        ->check(checked(problemOfMoment));
    history
        ->add_option("--node", options.node, "Only of this node: its path, the last part of it, or its name")
        ->type_name("NODE");
    history->add_option("--kind", options.kinds, "Only of this kind; may be given several times")
        ->type_name("KIND")
        ->expected(1)
        ->multi_option_policy(CLI::MultiOptionPolicy::TakeAll)
        ->check(checked(problemOfKind));
    history->add_option("--limit", options.limit, "Only the last N of them")
        ->type_name("N")
        ->check(wholeDecimal());
    history
        ->add_option("--keep-days", options.keepDays, "Keep entries for so long from now on; prints nothing")
        ->type_name("DAYS")
        ->check(secondsUpTo(36500));
    history
        ->add_option("--keep-megabytes", options.keepMegabytes,
                     "Let the file grow up to this size from now on; prints nothing")
        ->type_name("MB")
        ->check(secondsUpTo(100000));
    history->add_flag(
        "--changes", options.listsChanges,
        "The changes that were made by apply, or wait for their confirmation, with their numbers");
    addJson(*history, options);
    history->footer(
        "TIME is 2026-11-20, 2026-11-20T21:03:00Z, or how long ago: 90s, 30m, 2h, 7d.\n"
        "KIND is alert, published, withdrawn, written or changed.\n"
        "With --json each entry is one object on a line of its own.");
    history->callback([&options] { options.command = Command::history; });
}

std::string whyNoCommand(const CLI::App& app) {
    std::vector<std::string> rest = app.remaining();
    const auto word =
        std::ranges::find_if(rest, [](const std::string& text) { return !text.starts_with('-'); });
    if (word == rest.end()) {
        return "which command? Try: cvagent tree";
    }
    unmark(*word);
    return "there is no command " + inQuotes(*word) +
           "; the commands are: tree, get, set, plan, apply, export, diff, confirm, rollback, watch, "
           "history, properties, doctor";
}

/// The subcommand that was being read, for the hint.
std::string helpCommand(const CLI::App& app) {
    const auto given = app.get_subcommands();
    return given.empty() ? "cvagent --help" : "cvagent " + given.front()->get_name() + " --help";
}

}  // namespace

std::optional<Options> parseCommandLine(int count, const char* const* words) {
    if (auto plain = plainQuestion(count, words)) {
        return plain;
    }
    Options options;
    CLI::App app{kDescription, "cvagent"};
    app.footer(kFooter);
    app.set_version_flag("--version", "cvagent " CORVISTA_VERSION);
    app.require_subcommand(1);
    app.fallthrough();
    addAgentOptions(app, options);
    addCommandOptions(app, options);
    app.add_flag("--json", options.json)->group("");  // accepted in front of the command, too
    addReaders(app, options);
    addWatch(app, options);
    addSet(app, options);
    addChanges(app, options);
    addHistory(app, options);
    addOffline(app, options);
    try {
        app.parse(marked(count, words));
        unmark(options);
        options.byItself =
            std::ranges::any_of(kOwnOptions, [&app](const char* name) { return app.count(name) > 0; });
        return options;
    } catch (const CLI::Success& help) {
        std::ostringstream text;
        app.exit(help, text, text);
        print(text.str());
        return std::nullopt;
    } catch (const CLI::ParseError& error) {
        const bool noCommand =
            dynamic_cast<const CLI::RequiredError*>(&error) != nullptr && app.get_subcommands().empty();
        throw Failure(ExitStatus::usage, (noCommand ? whyNoCommand(app) : std::string(error.what())) +
                                             "\nSee: " + helpCommand(app));
    }
}

}  // namespace cvagent
