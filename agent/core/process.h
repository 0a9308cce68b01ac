#pragma once

#include <chrono>
#include <memory>
#include <string>
#include <vector>

#include "agent/core/agent.h"
#include "agent/core/host_tools.h"

namespace cvagent {

/// What a front end wants of its process.
struct ProcessSettings {
    /// Names of files that the front end was given. They become absolute, for they are meant from where the
    /// program was started, and stay reachable when they lie below /tmp.
    std::vector<std::string*> files;
    LogSettings log;  ///< its files are among them
    Commands commands = Commands::direct;
    HostTools hostTools = HostTools::automatic;
    /// Links may come whose names the host's own tools do not find: the front end stays.
    bool linksMayCome = false;
    /// How long another agent may go on holding the data directory.
    std::chrono::milliseconds waitForData{0};
};

/// All that an agent needs and that changes the whole process: surroundings, the data directory and the
/// variable that names it, standard error, the log, a /tmp of its own, the way commands are run, signals, and
/// the adapters in PATH. The main function of a front end makes it once, before any thread and before the
/// agent, and keeps it longer than the agent.
class PreparedProcess {
public:
    /// Throws Problem.
    explicit PreparedProcess(ProcessSettings settings);
    PreparedProcess(const PreparedProcess&) = delete;
    PreparedProcess& operator=(const PreparedProcess&) = delete;

    /// What an agent in this process starts from; its plug-ins are still to be named.
    AgentSettings agentSettings() const&;
    AgentSettings agentSettings() const&& = delete;  // the agent would outlive the process's set-up
    /// Errors of the plug-ins that belong to no call.
    ErrorLines& errors() const { return *errors_; }
    const DataDirectory& data() const { return *data_; }

private:
    std::vector<std::string> keptPlaces(const ProcessSettings& settings) const;

    std::shared_ptr<DataDirectory> data_;
    std::shared_ptr<ErrorLines> errors_ = std::make_shared<ErrorLines>();
    std::optional<QuietCommands> quiet_;
    std::shared_ptr<LogOutput> log_;
};

}  // namespace cvagent
