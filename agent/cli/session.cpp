#include "agent/cli/session.h"

#include "agent/core/host_tools.h"
#include "agent/core/signals.h"
#include "agent/core/surroundings.h"

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

Session::Session(const Options& options) : data_(std::make_shared<DataDirectory>()) {
    quiet_ = std::make_unique<QuietCommands>();
    hint(hintAtRoot(*data_), "\nTo see everything run: sudo cvagent");
    hint(hintAtReadOnly(*data_));
    prepareSurroundings();
    if (options.hostTools != HostTools::native) {
        putAdaptersFirst(inspectHostTools(options.hostTools, Look::adapters, adapterDirectory()),
                         data_->path() + "host-tools");
    }
    StopSignals::install();
    try {
        start(options);
    } catch (const Problem&) {
        show(*errors_);
        throw;
    }
    show(*errors_);
}

Session::~Session() {
    end();
}

void Session::start(const Options& options) {
    agent_ = std::make_unique<Agent>(settings(options));
    for (const Agent::FailedPlugin& failed : agent_->failedPlugins()) {
        complain(Failure(failed.problem).what());
        pluginMissing_ = true;
    }
    hint(hintAtTemporaryFiles());
}

AgentSettings Session::settings(const Options& options) const {
    const bool live = options.command == Command::watch || options.logLevel;
    AgentSettings settings;
    settings.plugins = options.plugins;
    if (settings.plugins.empty()) {
        settings.plugins.push_back(pluginBesideProgram());
    }
    settings.log = {options.logFile,
                    options.traceFile,
                    options.logLevel.value_or(kErrorLevel),
                    live ? messageDescriptor() : -1,
                    live,
                    live && !options.logLevel};
    settings.commandTime = std::chrono::duration<double>(options.commandSeconds);
    settings.data = data_;
    settings.tell = complain;
    settings.errors = errors_;
    return settings;
}

void Session::end() {
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

void goOnUnlessStopped() {
    if (StopSignals::received() != 0) {
        throw Interrupted();
    }
}

}  // namespace cvagent
