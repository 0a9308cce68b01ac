#pragma once

#include <optional>
#include <string>

#include "agent/cli/options.h"
#include "agent/core/command_deadline.h"
#include "agent/core/log_output.h"
#include "agent/core/plugin.h"
#include "agent/core/surroundings.h"

namespace cvagent {

/// A plug-in at work: surroundings, locked data directory, log, loaded library. Handles of nodes must be gone
/// before it is.
class Session {
public:
    /// @param listener as for Plugin
    explicit Session(const Options& options, Listener* listener = nullptr);
    ~Session();

    IC::ManagementInterface& interface() { return plugin_->interface(); }
    const std::string& pluginFile() const { return file_; }
    LogOutput& log() { return log_; }
    /// Throws Interrupted when a stop signal has come.
    static void goOnUnlessStopped();

private:
    void load(Listener* listener);

    std::string file_;
    DataDirectory data_;
    QuietCommands quiet_;
    LogOutput log_;
    std::optional<CommandDeadline> deadline_;
    std::unique_ptr<Plugin> plugin_;
};

}  // namespace cvagent
