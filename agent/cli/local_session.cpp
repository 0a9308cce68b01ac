#include "agent/cli/local_session.h"

#include <algorithm>
#include <mutex>

#include "agent/change/in_force.h"
#include "agent/cli/event_printer.h"
#include "agent/cli/kept_events.h"
#include "agent/cli/print.h"
#include "agent/core/catalogue_file.h"
#include "agent/core/node_classes.h"
#include "agent/core/plugin_files.h"
#include "agent/core/property_words.h"
#include "agent/core/surroundings.h"

namespace cvagent {

namespace {

constexpr const char* kRenameAdvice =
    "; rename the interface, bridge, team, disk or host of that name, or correct the file that names it: "
    "letters, digits, dots, dashes and underscores are fine";

// Of two changes at once the second waits.
constexpr std::chrono::seconds kWaitOfSet{3};
constexpr std::chrono::seconds kWaitOfApply{120};

void hint(const std::string& text, const std::string& advice = "") {
    if (!text.empty()) {
        complain(text + advice);
    }
}

/// A question for one node needs the processors only if it can mean one of them: by a path, by an id, by a
/// bare number. Another plug-in's builder may build anything, and a log is to be whole.
bool needsProcessors(const Options& options) {
    const bool ofChanges = options.command >= Command::plan && options.command <= Command::diff;
    const bool ofOneNode = options.command == Command::get || options.command == Command::set || ofChanges;
    if (!ofOneNode || !options.plugins.empty() || options.logFile || options.traceFile || options.logLevel) {
        return true;
    }
    const std::string last = options.node.substr(options.node.rfind('/') + 1);
    return last.starts_with(className(static_cast<unsigned int>(NodeType::processor))) ||
           last.find_first_not_of("0123456789") == std::string::npos;
}

}  // namespace

void findPlugins(Options& options) {
    options.pluginsNamed = !options.plugins.empty();
    if (!options.pluginsNamed) {
        PluginFiles found = pluginsBesideProgram();
        for (const LeftOut& one : found.leftOut) {
            complain(Failure(one.problem).what());
        }
        options.plugins = std::move(found.files);
        options.pluginMissing = !found.leftOut.empty();
    }
    for (const std::string& plugin : options.plugins) {
        options.catalogues.push_back(catalogueFileOf(plugin));
    }
}

/// Where alerts go. The plug-in takes for told what it has told any agent: so whatever the command is, each
/// is shown, even one of what happened while no agent ran.
struct LocalSession::Alerts {
    std::mutex guard;  // guards everything below
    std::function<void(const Event&)> receiver;

    void tell(const Event& alert) {
        const std::lock_guard lock(guard);
        if (receiver) {
            receiver(alert);
        }
    }
    void set(std::function<void(const Event&)> next) {
        const std::lock_guard lock(guard);
        receiver = std::move(next);
    }
};

ProcessSettings processSettings(Options& options) {
    options.processors = needsProcessors(options);
    findPlugins(options);
    ProcessSettings settings;
    settings.files.push_back(&options.program);
    for (std::vector<std::string>* files : {&options.plugins, &options.catalogues}) {
        for (std::string& file : *files) {
            settings.files.push_back(&file);
        }
    }
    const bool shown = options.command == Command::watch || options.logLevel;
    settings.log = {options.logFile, options.traceFile,          options.logLevel.value_or(kErrorLevel),
                    shown,           shown && !options.logLevel, kRenameAdvice};
    settings.commands = options.commands;
    settings.waitForData = options.command == Command::set     ? kWaitOfSet
                           : options.command == Command::apply ? kWaitOfApply
                                                               : std::chrono::seconds(0);
    settings.hostTools = options.hostTools;
    return settings;
}

LocalSession::LocalSession(const PreparedProcess& process, const Options& options, WantMessages& wants)
    : errors_(process.errors()),
      alerts_(std::make_shared<Alerts>()),
      answersForAll_(options.pluginsNamed || options.command == Command::tree ||
                     options.command == Command::watch),
      pluginMissing_(options.pluginMissing) {
    if (options.command == Command::watch) {
        watching_.emplace();
    } else {
        alerts_->set(complainOfAlert);
    }
    AgentSettings settings = process.agentSettings();
    settings.plugins = options.plugins;
    settings.commandTime = std::chrono::duration<double>(options.commandSeconds);
    settings.processors = options.processors;
    settings.tell = complain;
    settings.keeper = eventKeeper();
    settings.bringIntoForce = change::bringingIntoForce();
    settings.alertTold = [alerts = alerts_](const Event& alert) { alerts->tell(alert); };
    hint(limitsOfUser(process.data()), "\nTo see everything run: sudo cvagent");
    hint(limitsOfData(process.data()));
    try {
        start(settings, wants);
    } catch (const Problem&) {
        showLines(errors_);
        throw;
    }
    showLines(errors_);
}

LocalSession::~LocalSession() {
    stop();
}

void LocalSession::start(const AgentSettings& settings, WantMessages& wants) {
    agent_ = std::make_unique<Agent>(settings);
    for (const Agent::FailedPlugin& failed : agent_->failedPlugins()) {
        complain(Failure(failed.problem).what());
        pluginMissing_ = true;
    }
    hint(limitsOfTmp());
    const std::vector<NodeRef> nodes = agent_->nodes();
    wants.tell(&nodes, settings.processors);
}

Session::Tree LocalSession::tree(const Request& request) {
    Tree whole{agent_->plugins(), agent_->nodes(), {}};
    whole.readings = agent_->readTree(whole.nodes, request);
    return whole;
}

NodeRef LocalSession::find(const std::string& word) {
    return agent_->find(word);
}

std::vector<Reading> LocalSession::read(const NodeRef& node, const std::vector<std::string>& properties,
                                        const Request& request) {
    return agent_->read(node, readableIds(*node, properties), Freshness::now, request);
}

WriteResult LocalSession::write(const NodeRef& node, const Property& row,
                                const std::vector<std::string>& words, const Request& request) {
    return agent_->write(node, row, acceptedValue(row, words), request);
}

std::shared_ptr<Subscription> LocalSession::subscribe(std::optional<Event::Kind> only) {
    return agent_->subscribe(0, only);
}

std::size_t LocalSession::countNodes() {
    return agent_->nodes().size();
}

void LocalSession::sendAlertsTo(std::function<void(const Event&)> receiver) {
    alerts_->set(receiver ? std::move(receiver) : complainOfAlert);
}

void LocalSession::tellMissingTools(const std::vector<Reading>& properties) {
    const std::vector<std::string> files = agent_->plugins();
    if (std::ranges::none_of(files, isOfThisSystem)) {
        return;  // whatever another plug-in runs
    }
    for (const MissingTool& missing : missingTools()) {
        const bool concerned =
            properties.empty() || std::ranges::any_of(properties, [&missing](const Reading& reading) {
                return missing.costsProperty(reading.name());
            });
        if (concerned) {
            complain("there is no " + missing.tool + " (package " + missing.package +
                     "), without which these are not known or changed: " + missing.costs);
        }
    }
}

void LocalSession::stop() {
    const OrderlyEnd unloading;
    agent_.reset();
    showLines(errors_);
}

void LocalSession::end() {
    stop();
}

void LocalSession::announce(const Event& event) {
    agent_->announce(event);
}

void LocalSession::showErrors(const Request& request) {
    showLines(request.errors());
    showLines(errors_);
}

ExitStatus LocalSession::statusAfter(ExitStatus own) const {
    return own == ExitStatus::done && pluginMissing_ && answersForAll_ ? ExitStatus::failed : own;
}

}  // namespace cvagent
