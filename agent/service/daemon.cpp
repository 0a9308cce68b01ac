#include "agent/service/daemon.h"

#include <malloc.h>
#include <unistd.h>

#include <algorithm>
#include <csignal>
#include <cstdlib>
#include <optional>

#include "agent/change/in_force.h"
#include "agent/core/catalogue_file.h"
#include "agent/core/data_directory.h"
#include "agent/core/plugin_files.h"
#include "agent/core/process.h"
#include "agent/core/signals.h"
#include "agent/service/log.h"
#include "agent/service/manager.h"
#include "agent/service/names.h"
#include "agent/service/past.h"
#include "agent/service/private_bus.h"
#include "agent/service/service.h"
#include "agent/service/stop_request.h"

namespace cvagent::service {

namespace {

/// A write that was begun has this long before a stop cuts it off; shorter than a manager waits.
constexpr std::chrono::seconds kWriteAtStop{60};
constexpr std::chrono::milliseconds kLookForWrites{50};
constexpr std::chrono::seconds kTidyUp{10};

void findPlugins(Options& options) {
    if (options.plugins.empty()) {
        PluginFiles found = pluginsBesideProgram();
        for (const LeftOut& one : found.leftOut) {
            log(Priority::warning, one.problem.what());
        }
        options.plugins = std::move(found.files);
    }
    for (const std::string& plugin : options.plugins) {
        options.catalogues.push_back(catalogueFileOf(plugin));
    }
}

ProcessSettings processSettings(Options& options) {
    ProcessSettings settings;
    settings.files.push_back(&options.config);
    for (std::vector<std::string>* files : {&options.plugins, &options.catalogues}) {
        for (std::string& file : *files) {
            settings.files.push_back(&file);
        }
    }
    settings.log.advice =
        "; rename what has that name: letters, digits, dots, dashes and underscores are fine";
    settings.commands = options.commands;
    settings.hostTools = options.hostTools;
    settings.linksMayCome = true;
    return settings;
}

/// Nothing when the file is wrong, which is told line by line.
std::optional<Config> goodConfig(const Options& options) {
    const ReadConfig read = readConfig(options.config, options.configNamed);
    for (const std::string& complaint : read.complaints) {
        log(Priority::error, options.config + ": " + complaint);
    }
    return read.complaints.empty() ? std::optional(read.config) : std::nullopt;
}

AgentSettings agentSettings(const PreparedProcess& process, const Options& options, const Config& config,
                            const Past& past) {
    AgentSettings settings = process.agentSettings();
    settings.plugins = options.plugins;
    settings.commandTime = config.commandTime;
    settings.keeper = past.keeper();
    settings.lastEvent = past.last();
    settings.bringIntoForce = change::bringingIntoForce();
    settings.tell = [](const std::string& text) { log(Priority::warning, text); };
    return settings;
}

/// The unit's sandbox makes no namespaces: there the manager starts another one when it is asked.
change::RehearsalSettings rehearsalSettings(const Agent& agent, const Options& options,
                                            const Manager& manager) {
    constexpr const char* kPlanSocket = "/run/corvista/plan";
    change::RehearsalSettings settings;
    settings.plugins = agent.plugins();
    const char* data = std::getenv(kDataVariable);
    settings.dataDirectory = data != nullptr ? data : "";
    settings.hostTools = options.hostTools;
    settings.commands = options.commands;
    settings.socket = manager.isThere() ? kPlanSocket : "";
    return settings;
}

void showErrors(ErrorLines& errors) {
    const ErrorLines::Taken taken = errors.take();
    for (const std::string& text : taken.texts) {
        log(Priority::warning, "a plug-in reports: " + text);
    }
    if (taken.lost > 0) {
        log(Priority::warning, "a plug-in reports: and " + std::to_string(taken.lost) + " more");
    }
}

/// The service at work, until something ends it.
class Daemon {
public:
    Daemon(const Options& options, const Manager& manager, bus::Connection& connection, ErrorLines& errors)
        : options_(options), manager_(manager), connection_(connection), errors_(errors) {}

    void run(Agent& agent, const Config& config, const Past& past, const LinkIndices& linksBefore) {
        Service service(loop_, connection_, agent, config, rehearsalSettings(agent, options_, manager_),
                        Past::read, past.last());
        service_ = &service;
        service.whenBusIsFull([this] { leaveFullBus(); });
        sd_bus_attach_event(connection_.get(), loop_.get(), SD_EVENT_PRIORITY_NORMAL);
        signals_ = loop_.whenReadable(stop_.descriptor(), [this] { takeSignals(); });
        service.begin(linksBefore);
        const std::string state =
            std::to_string(service.nodes()) + " nodes on the bus as " + connection_.uniqueName();
        log(Priority::info, state);
        manager_.status(state);
        manager_.ready();
        malloc_trim(0);  // the start needs more than the service at rest
        feedWatchdog();
        tidyUp();
        watchBus();
        loop_.run();
        sd_bus_detach_event(connection_.get());
        leaveBus();
    }
    bool busLost() const { return busLost_; }
    bool busFull() const { return busFull_; }
    int endedBy() const { return signal_; }
    void giveSignalsBack() { stop_.release(); }

private:
    /// When the bus has answered twice it has passed on what it was given before. A bus of our own ends next.
    void leaveBus() const {
        try {
            connection_.releaseName(kBusName);
            whoServes(connection_);
        } catch (const bus::Error&) {
            // It is gone.
        }
    }

    void takeSignals() {
        for (int signal = StopRequest::take(); signal != 0; signal = StopRequest::take()) {
            if (signal == SIGHUP) {
                reload();
            } else if (signal_ == 0) {
                signal_ = signal;
                stop();
            }
        }
    }

    void stop() {
        manager_.stopping();
        service_->windDown();
        endWhenWritten(std::chrono::steady_clock::now() + kWriteAtStop);
    }

    /// Somebody hears the signals and does not read them. Who connects anew may leave as much again, and by
    /// then the bus itself gives such a reader no more.
    void leaveFullBus() {
        busFull_ = true;
        stop();
    }

    void endWhenWritten(std::chrono::steady_clock::time_point latest) {
        if (!service_->isWriting() || std::chrono::steady_clock::now() >= latest) {
            loop_.mailbox()->post([this] { loop_.stop(); });  // behind the answer to the last write
            return;
        }
        writes_ = loop_.after(kLookForWrites, [this, latest] { endWhenWritten(latest); });
    }

    void reload() {
        manager_.reloading();
        try {
            if (const auto config = goodConfig(options_)) {
                service_->configure(*config);
                Past::configure(*config);
                log(Priority::info, "the configuration was read again");
            } else {
                log(Priority::warning, "the configuration stays as it was");
            }
        } catch (const Problem& problem) {
            log(Priority::warning, std::string(problem.what()) + "; the configuration stays as it was");
        }
        manager_.ready();
    }

    void feedWatchdog() {
        if (const auto interval = manager_.watchdogInterval()) {
            manager_.alive();
            watchdog_ = loop_.after(*interval, [this] { feedWatchdog(); });
        }
    }

    /// Tells what the plug-ins' own threads report, and gives back what is not needed any more.
    void tidyUp() {
        showErrors(errors_);
        service_->giveBack();
        tidyDue_ = loop_.after(kTidyUp, [this] { tidyUp(); });
    }

    void watchBus() {
        lost_ = connection_.match(
            "type='signal',sender='org.freedesktop.DBus.Local',path='/org/freedesktop/DBus/Local',"
            "interface='org.freedesktop.DBus.Local',member='Disconnected'",
            [this](const bus::Message&) {
                busLost_ = true;
                loop_.stop();
            });
    }

    const Options& options_;
    const Manager& manager_;
    bus::Connection& connection_;
    ErrorLines& errors_;
    Loop loop_;
    StopRequest stop_;
    Service* service_ = nullptr;
    Loop::Source signals_;
    Loop::Source watchdog_;
    Loop::Source writes_;
    Loop::Source tidyDue_;
    bus::Slot lost_;
    int signal_ = 0;
    bool busLost_ = false;
    bool busFull_ = false;
};

void refuseASecond(const bus::Connection& connection) {
    if (const std::string who = whoServes(connection); !who.empty()) {
        throw Problem(Problem::busy, "another agent is on this bus already: " + who);
    }
}

ExitStatus serve(Options& options, const Manager& manager, bus::Connection& connection) {
    const PreparedProcess process(processSettings(options));
    const auto config = goodConfig(options);
    if (!config) {
        return ExitStatus::usage;
    }
    const OrderlyEnd orderly;
    const Past past;
    Past::configure(*config);
    Daemon daemon(options, manager, connection, process.errors());
    {
        const LinkIndices linksBefore = linkIndices();
        Agent agent(agentSettings(process, options, *config, past));
        for (const Agent::FailedPlugin& failed : agent.failedPlugins()) {
            log(Priority::warning, failed.problem.what());
        }
        daemon.run(agent, *config, past, linksBefore);
        daemon.giveSignalsBack();
        if (daemon.endedBy() != 0) {
            kill(getpid(), daemon.endedBy());  // from here on the end is a matter of a second
        }
    }
    showErrors(process.errors());
    if (daemon.busLost()) {
        throw Problem(Problem::failed, "the bus is gone");
    }
    if (daemon.busFull()) {
        throw Problem(Problem::failed,
                      "somebody does not read what the bus keeps for him, and it would soon listen no more: "
                      "start the service again");
    }
    return ExitStatus::done;
}

}  // namespace

ExitStatus runDaemon(Options& options) {
    if (options.check) {
        return goodConfig(options) ? ExitStatus::done : ExitStatus::usage;
    }
    const Manager manager;
    findPlugins(options);
    std::optional<PrivateBus> own;
    if (options.privateBus) {
        own.emplace(options.runDirectory.empty() ? PrivateBus::standardDirectory() : options.runDirectory);
        options.bus = own->address();
        log(Priority::info, "a bus of its own: " + own->address());
    }
    ExitStatus status = ExitStatus::done;
    {
        bus::Connection connection(options.bus);
        refuseASecond(connection);
        status = serve(options, manager, connection);
    }
    own.reset();
    if (StopSignals::received() != 0) {
        StopSignals::die();
    }
    return status;
}

}  // namespace cvagent::service
