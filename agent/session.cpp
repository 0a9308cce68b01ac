#include "agent/session.h"

#include "agent/failure.h"
#include "agent/host_tools.h"
#include "agent/signals.h"
#include "agent/want.h"

namespace cvagent {

Session::Session(const Options& options, Listener* listener)
    : file_(options.plugin ? *options.plugin : pluginBesideProgram()), log_(options, listener != nullptr) {
    hintAtRoot(data_);
    hintAtReadOnly(data_);
    prepareSurroundings();
    if (options.hostTools != HostTools::native) {
        putAdaptersFirst(inspectHostTools(options.hostTools, Look::adapters, adapterDirectory()),
                         data_.path() + "host-tools");
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
