#include "agent/cli/session.h"

#include <filesystem>

#include "agent/core/environment.h"
#include "agent/core/host_tools.h"
#include "agent/core/private_tmp.h"
#include "agent/core/program_path.h"
#include "agent/core/signals.h"
#include "agent/core/surroundings.h"
#include "agent/core/want.h"

namespace cvagent {

namespace {

void hint(const std::string& text, const std::string& advice = "") {
    if (!text.empty()) {
        complain(text + advice);
    }
}

void show(ErrorLines& errors) {
    const ErrorLines::Taken taken = errors.take();
    for (const std::string& text : taken.texts) {
        complain("the plug-in reports: " + text);
    }
    if (taken.lost > 0) {
        complain("the plug-in reports: and " + std::to_string(taken.lost) +
                 " more; --log FILE keeps them all");
    }
}

}  // namespace

Session::Session(const Options& options) {
    AgentSettings settings = settingsOf(options);
    hint(hintAtRoot(*data_), "\nTo see everything run: sudo cvagent");
    hint(hintAtReadOnly(*data_));
    makeTmpPrivate(ownPlaces(options, settings));
    setUpCommands(options.commands);
    StopSignals::install();
    if (options.hostTools != HostTools::native) {
        putAdaptersOnPath(inspectHostTools(options.hostTools, Look::adapters, adapterDirectory()));
    }
    try {
        start(settings);
    } catch (const Problem&) {
        show(*errors_);
        throw;
    }
    show(*errors_);
}

Session::~Session() {
    end();
}

void Session::start(const AgentSettings& settings) {
    agent_ = std::make_unique<Agent>(settings);
    for (const Agent::FailedPlugin& failed : agent_->failedPlugins()) {
        complain(Failure(failed.problem).what());
        pluginMissing_ = true;
    }
    hint(hintAtTemporaryFiles());
    const std::vector<Handle> nodes = handlesOf(agent_->nodes());
    tellWant(&nodes, complain);
}

/// The log is opened here, before /tmp becomes another one.
AgentSettings Session::settingsOf(const Options& options) {
    const bool live = options.command == Command::watch || options.logLevel;
    AgentSettings settings;
    settings.plugins = options.plugins;
    if (settings.plugins.empty()) {
        settings.plugins.push_back(pluginBesideProgram());
    }
    data_ = std::make_shared<DataDirectory>();
    quiet_ = std::make_unique<QuietCommands>();
    const LogSettings log{options.logFile,
                          options.traceFile,
                          options.logLevel.value_or(kErrorLevel),
                          live ? messageDescriptor() : -1,
                          live,
                          live && !options.logLevel};
    settings.log = std::make_shared<LogOutput>(log, errors_);
    settings.commandTime = std::chrono::duration<double>(options.commandSeconds);
    settings.data = data_;
    settings.tell = complain;
    return settings;
}

/// What the agent needs of the /tmp that everybody sees, should it lie there.
std::vector<std::string> Session::ownPlaces(const Options& options, const AgentSettings& settings) const {
    std::vector<std::string> places = directoriesOnPath();
    const std::filesystem::path adapters = adapterDirectory().value_or("");
    places.insert(places.end(), settings.plugins.begin(), settings.plugins.end());
    places.insert(places.end(), {options.program, programDirectory(), data_->path(), adapters.parent_path(),
                                 options.logFile.value_or(""), options.traceFile.value_or("")});
    return places;
}

void Session::end() {
    const OrderlyEnd unloading;
    agent_.reset();
    show(*errors_);
}

void Session::showErrors(const Request& request) {
    show(request.errors());
    show(*errors_);
}

ExitStatus Session::statusAfter(ExitStatus own) const {
    return own == ExitStatus::done && pluginMissing_ ? ExitStatus::failed : own;
}

Request ownRequest() {
    return Request("the command line");
}

}  // namespace cvagent
