#include "agent/service/options.h"

#include <unistd.h>

#include <CLI/CLI.hpp>
#include <map>
#include <sstream>

namespace cvagent::service {

namespace {

constexpr const char* kDescription =
    "The agent of this host as a service on D-Bus: com.vantrel.Corvista1.\n"
    "It runs in the foreground, under a service manager or in a terminal, until SIGTERM or Ctrl-C.\n";
constexpr const char* kFooter =
    "\nSIGHUP reads the configuration again.\n"
    "Exit status: 0 done, 1 it failed, 2 wrong usage or configuration, 5 another agent is at work.\n"
    "\nExamples:\n"
    "  cvagentd --check\n"
    "  cvagentd --private-bus\n"
    "  busctl --address=unix:path=/run/corvista/bus tree com.vantrel.Corvista1";

void printOut(const std::string& text) {
    for (std::size_t done = 0; done < text.size();) {
        const ssize_t size = write(STDOUT_FILENO, text.data() + done, text.size() - done);
        if (size <= 0) {
            throw UsageError("cannot write to standard output");
        }
        done += static_cast<std::size_t>(size);
    }
}

template <class Value>
CLI::Validator wordOf(const std::map<std::string, Value>& words) {
    return CLI::Validator(
        [words](std::string& text) {
            const auto found = words.find(text);
            if (found == words.end()) {
                return "'" + text + "' is no choice";
            }
            text = std::to_string(static_cast<int>(found->second));
            return std::string();
        },
        "");
}

void addOptions(CLI::App& app, Options& options) {
    app.add_flag("--check", options.check, "Read the configuration, say what is wrong with it, and end");
    app.add_option("--config", options.config, "The configuration. Default: /etc/corvista/agent.conf")
        ->type_name("FILE");
    auto* bus =
        app.add_option("--bus", options.bus, "The bus to serve: the system's (default) or one's address")
            ->type_name("system|ADDRESS");
    auto* own = app.add_flag("--private-bus", options.privateBus,
                             "Start a bus of its own, for hosts without a system bus, and serve that");
    own->excludes(bus);
    app.add_option("--run-dir", options.runDirectory,
                   "Where the socket of the private bus lies. Default: /run/corvista")
        ->type_name("DIRECTORY")
        ->needs(own);
    app.add_option("--plugin", options.plugins,
                   "The plug-in to load, in place of all those beside this program. Several may be given")
        ->type_name("FILE")
        ->expected(1)
        ->allow_extra_args(false)
        ->multi_option_policy(CLI::MultiOptionPolicy::TakeAll);
    const std::map<std::string, HostTools> tools{
        {"auto", HostTools::automatic}, {"native", HostTools::native}, {"classic", HostTools::classic}};
    app.add_option("--host-tools", options.hostTools, "As of cvagent")
        ->type_name("auto|native|classic")
        ->transform(wordOf(tools));
    const std::map<std::string, Commands> ways{{"direct", Commands::direct}, {"shell", Commands::shell}};
    app.add_option("--commands", options.commands, "As of cvagent")
        ->type_name("direct|shell")
        ->transform(wordOf(ways));
}

}  // namespace

std::optional<Options> parseOptions(int count, const char* const* words) {
    Options options;
    CLI::App app{kDescription, "cvagentd"};
    app.footer(kFooter);
    app.set_version_flag("--version", "cvagentd " CORVISTA_VERSION);
    addOptions(app, options);
    try {
        app.parse(count, words);
        options.configNamed = app.count("--config") > 0;
        return options;
    } catch (const CLI::Success& help) {
        std::ostringstream text;
        app.exit(help, text, text);
        printOut(text.str());
        return std::nullopt;
    } catch (const CLI::ParseError& error) {
        throw UsageError(std::string(error.what()) + "\nSee: cvagentd --help");
    }
}

}  // namespace cvagent::service
