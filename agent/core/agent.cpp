#include "agent/core/agent.h"

#include <algorithm>
#include <set>
#include <stdexcept>
#include <utility>

#include "agent/core/announcer.h"
#include "agent/core/command_deadline.h"
#include "agent/core/event_keeping.h"
#include "agent/core/oshw/start_facts.h"
#include "agent/core/oshw/stored_facts.h"
#include "agent/core/plugin_files.h"
#include "agent/core/plugin_start.h"
#include "agent/core/text.h"
#include "agent/core/tree.h"

namespace cvagent {

namespace {

constexpr std::chrono::seconds kPatience{10};  // a hung command is ended by then

/// What a tree shows of a node, and what it would show if the host told it by now; ascending.
std::vector<unsigned int> shownOf(const IC::MutableNode& node) {
    std::set<unsigned int> ids;
    for (const auto& [id, value] : storedProperties(node)) {
        ids.insert(id);
    }
    if (const NodeClass* known = findClass(node.nodeType())) {
        ids.insert(known->live.begin(), known->live.end());
    }
    for (const unsigned int id : oshw::startFacts(node)) {
        ids.insert(id);
    }
    return {ids.begin(), ids.end()};
}

}  // namespace

/// In the order in which things are made; what comes later uses what comes before.
struct Agent::Engine {
    explicit Engine(const AgentSettings& settings);

    NodesOfEach nodesOfEach() const;
    void startAll(std::vector<PluginStart>& starts, const AgentSettings& settings);
    void refresh();
    bool lists(const Handle& node) const;
    Listener& listenerOf(const std::shared_ptr<EventKeeper>& keeper);

    std::shared_ptr<DataDirectory> data;
    Tell tell;
    std::shared_ptr<LogOutput> log;
    CommandDeadline deadline;
    EventLog events;
    std::optional<EventKeeping> keeping;  // in front of the log, where somebody keeps events
    Facts facts;
    Announcer announcer;
    std::vector<std::unique_ptr<Plugin>> plugins;
    std::vector<FailedPlugin> failed;
    Pool pool;
    Reader reader{pool, facts};
    Writer writer;
};

Agent::Engine::Engine(const AgentSettings& settings)
    : data(settings.data),
      tell(settings.tell),
      log(settings.log ? settings.log
                       : std::make_shared<LogOutput>(LogSettings(), std::make_shared<ErrorLines>())),
      deadline(settings.commandTime, settings.tell),
      events(EventLog::kMostPast, settings.lastEvent),
      announcer(listenerOf(settings.keeper), facts, settings.alertTold),
      writer(pool, facts, announcer,
             {[this] { refresh(); }, [this](const Handle& node) { return lists(node); }},
             settings.bringIntoForce) {
    if (!data) {
        throw std::invalid_argument("an agent needs a data directory");
    }
    std::vector<PluginStart> starts;
    for (const std::string& file : settings.plugins) {
        starts.emplace_back(file, &announcer, tell,
                            [this](const Plugin& plugin) { announcer.takeStock(plugin.interface()); });
    }
    startAll(starts, settings);
    for (PluginStart& start : starts) {
        if (const auto problem = start.problem()) {
            failed.push_back({start.file(), *problem});
        } else {
            plugins.push_back(start.take());
        }
    }
    if (plugins.empty() && !failed.empty()) {
        throw Problem(failed.front().problem);
    }
}

Listener& Agent::Engine::listenerOf(const std::shared_ptr<EventKeeper>& keeper) {
    if (!keeper) {
        return events;
    }
    return keeping.emplace(events, keeper);
}

/// The plug-in for this system waits most for the host's tools, whose time is limited, and starts on the
/// calling thread; so do those for which the system gives no thread, and one that is alone.
void Agent::Engine::startAll(std::vector<PluginStart>& starts, const AgentSettings& settings) {
    std::vector<PluginStart*> here;
    for (PluginStart& start : starts) {
        const bool waits = starts.size() == 1 || isOfThisSystem(start.file());
        if (waits || !start.aside(settings.processors)) {
            here.push_back(&start);
        }
    }
    for (PluginStart* start : here) {
        start->here(settings.processors);
    }
    for (PluginStart& start : starts) {
        start.await(settings.startTime);
    }
}

NodesOfEach Agent::Engine::nodesOfEach() const {
    NodesOfEach all;
    for (const auto& plugin : plugins) {
        all.push_back(plugin->interface().holdAll());
    }
    return all;
}

void Agent::Engine::refresh() {
    for (const auto& plugin : plugins) {
        setPaths(plugin->interface());
        plugin->noteIds();
        announcer.announceNew(plugin->interface());
    }
}

bool Agent::Engine::lists(const Handle& node) const {
    return std::any_of(plugins.begin(), plugins.end(), [&node](const auto& plugin) {
        return plugin->interface().hold(node->getNodeId()).get() == node.get();
    });
}

Agent::Agent(const AgentSettings& settings) : engine_(std::make_shared<Engine>(settings)) {}

Agent::~Agent() {
    engine_->pool.settle(kPatience);
}

const std::vector<Agent::FailedPlugin>& Agent::failedPlugins() const {
    return engine_->failed;
}

std::vector<std::string> Agent::plugins() const {
    std::vector<std::string> files;
    for (const auto& plugin : engine_->plugins) {
        files.push_back(plugin->file());
    }
    return files;
}

std::vector<NodeRef> Agent::nodes() const {
    std::vector<NodeRef> all;
    for (const std::vector<Handle>& nodes : engine_->nodesOfEach()) {
        for (const Handle& node : nodes) {
            all.push_back(NodeRef(engine_, node));
        }
    }
    return all;
}

NodeRef Agent::find(const std::string& text) const {
    return {engine_, findNode(engine_->nodesOfEach(), text)};
}

std::vector<Reading> Agent::read(const NodeRef& node, const std::vector<unsigned int>& ids,
                                 Freshness freshness, const Request& request) const {
    return engine_->reader.read(node.node_, ids, freshness, request);
}

std::vector<std::vector<Reading>> Agent::readTree(const std::vector<NodeRef>& nodes,
                                                  const Request& request) const {
    std::vector<Reader::Question> questions;
    std::vector<std::size_t> places;
    std::vector<std::vector<Reading>> all;
    for (std::size_t i = 0; i < nodes.size(); ++i) {
        all.push_back(storedReadings(*nodes[i]));
        const NodeClass* nodeClass = findClass(nodes[i]->nodeType());
        for (const unsigned int id :
             nodeClass != nullptr ? nodeClass->live : std::span<const unsigned int>()) {
            questions.push_back({nodes[i].node_, id});
            places.push_back(i);
        }
    }
    const std::vector<Reading> read = engine_->reader.readNow(questions, request);
    for (std::size_t i = 0; i < read.size(); ++i) {
        std::vector<Reading>& readings = all[places[i]];
        const auto place = std::ranges::lower_bound(readings, read[i].id, {}, &Reading::id);
        if (place != readings.end() && place->id == read[i].id) {
            *place = read[i];
        } else if (!read[i].missing) {
            readings.insert(place, read[i]);
        }
    }
    return all;
}

std::vector<std::vector<Reading>> Agent::readAnew(const std::vector<Asked>& asked,
                                                  const Request& request) const {
    std::vector<Reader::Question> questions;
    std::vector<long> counts;
    for (const Asked& one : asked) {
        const std::vector<unsigned int> ids = one.ids.empty() ? shownOf(*one.node) : one.ids;
        for (const unsigned int id : ids) {
            questions.push_back({one.node.node_, id, Source::host});
        }
        counts.push_back(static_cast<long>(ids.size()));
    }
    const std::vector<Reading> read = engine_->reader.readNow(questions, request);
    std::vector<std::vector<Reading>> all;
    auto next = read.begin();
    for (std::size_t i = 0; i < asked.size(); ++i) {
        std::vector<Reading>& own = all.emplace_back(next, next + counts[i]);
        next += counts[i];
        oshw::storeAnew(*asked[i].node.node_, own);
    }
    return all;
}

bool Agent::lookForLinks(const Request& request) const {
    for (const std::vector<Handle>& nodes : engine_->nodesOfEach()) {
        const auto node =
            std::ranges::find_if(nodes, [](const Handle& each) { return oshw::takesLookForLinks(*each); });
        if (node != nodes.end()) {
            engine_->writer.between(request, [&node] { oshw::lookForLinks(**node); });
            return true;
        }
    }
    return false;
}

void Agent::withdraw(const std::vector<NodeRef>& nodes, const Request& request) const {
    engine_->writer.between(request, [&] {
        for (const NodeRef& node : nodes) {
            for (const auto& plugin : engine_->plugins) {
                plugin->interface().deleteNode(node.node_.get());  // one that another one has fails
            }
        }
    });
}

void Agent::restartPluginOf(const NodeRef& node, const Request& request) const {
    engine_->writer.between(request, [&] {
        for (const auto& plugin : engine_->plugins) {
            if (plugin->interface().hold(node->getNodeId()).get() == node.node_.get()) {
                const std::vector<Handle> before = plugin->interface().holdAll();
                plugin->startAgain();
                engine_->announcer.announceRestart(before, plugin->interface());
            }
        }
    });
}

void Agent::setStatus(const NodeRef& node, unsigned int status) const {
    node.node_->setStatus(status);
}

WriteResult Agent::write(const NodeRef& node, const Property& row, const IC::PropertyValue& value,
                         const Request& request) const {
    return engine_->writer.write(node.node_, row, value, request);
}

void Agent::announce(const Event& event) const {
    engine_->announcer.hear(event);
}

std::shared_ptr<Subscription> Agent::subscribe(std::uint64_t after, std::optional<Event::Kind> only) const {
    return engine_->events.subscribe(after, EventLog::kMost, only);
}

}  // namespace cvagent
