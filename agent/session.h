#pragma once

#include <optional>
#include <string>

#include "agent/command_deadline.h"
#include "agent/log_output.h"
#include "agent/options.h"
#include "agent/plugin.h"
#include "agent/surroundings.h"

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
