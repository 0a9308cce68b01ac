#include "agent/session.h"

#include <filesystem>

#include "agent/environment.h"
#include "agent/failure.h"
#include "agent/host_tools.h"
#include "agent/private_tmp.h"
#include "agent/program_path.h"
#include "agent/shell/child.h"
#include "agent/shell/runner.h"
#include "agent/signals.h"
#include "agent/want.h"

namespace cvagent {

namespace {

/// What the agent needs of the /tmp that everybody sees, should it lie there.
std::vector<std::string> ownPlaces(const Options& options, const std::string& plugin,
                                   const DataDirectory& data) {
    std::vector<std::string> places = directoriesOnPath();
    const std::filesystem::path adapters = adapterDirectory().value_or("");
    places.insert(places.end(), {plugin, programDirectory(), data.path(), adapters.parent_path(),
                                 options.logFile.value_or(""), options.traceFile.value_or("")});
    return places;
}

}  // namespace

Session::Session(const Options& options, Listener* listener)
    : file_(options.plugin ? *options.plugin : pluginBesideProgram()), log_(options, listener != nullptr) {
    hintAtRoot(data_);
    hintAtReadOnly(data_);
    makeTmpPrivate(ownPlaces(options, file_, data_));
    StopSignals::install();
    shell::leaveAllToShell(options.commands == Commands::shell);
    QX::setKillWitness(shell::noteKill);
    if (options.hostTools != HostTools::native) {
        putAdaptersFirst(inspectHostTools(options.hostTools, Look::adapters, adapterDirectory()));
    }
    deadline_.emplace(std::chrono::duration<double>(options.commandSeconds));
    try {
        load(listener);
    } catch (const Failure&) {
        log_.showErrors();
        throw;
    }
    log_.showErrors();
}

Session::~Session() {
    const OrderlyEnd unloading;
    plugin_.reset();
    log_.showErrors();
}

void Session::load(Listener* listener) {
    plugin_ = std::make_unique<Plugin>(file_, listener);
    hintAtTemporaryFiles();
    tellWant(&plugin_->interface());
}

}  // namespace cvagent
