#include "agent/cli/rehearsed.h"

#include <algorithm>
#include <iterator>

#include "agent/change/order.h"
#include "agent/cli/local_session.h"

namespace cvagent {

change::Plan rehearsed(const Options& options, const std::vector<MeantChange>& changes) {
    change::RehearsalSettings settings;
    Options found = options;
    if (found.plugins.empty()) {  // the service has answered so far
        findPlugins(found);
    }
    settings.plugins = found.plugins;
    settings.hostTools = options.hostTools;
    settings.commands = options.commands;
    std::vector<change::Change> plain;
    std::ranges::transform(changes, std::back_inserter(plain), [](const MeantChange& each) {
        return change::Change{each.node->getPath(), each.row->id, each.words};
    });
    return change::rehearse(settings, plain);
}

std::vector<std::size_t> toBeMade(const std::vector<MeantChange>& changes, const std::vector<Found>& found) {
    std::vector<change::Wanted> wanted;
    std::ranges::transform(changes, std::back_inserter(wanted), &MeantChange::wanted);
    std::vector<std::size_t> order = change::orderOf(wanted);
    std::erase_if(order, [&](std::size_t i) {
        return !change::isDeed(*changes[i].row) && found[i].standing.outcome == WriteResult::applied;
    });
    return order;
}

std::vector<change::Objection> objectionsToThese(const std::vector<MeantChange>& changes,
                                                 const std::vector<std::size_t>& indices) {
    std::vector<change::Objection> objections = objectionsTo(changes);
    std::erase_if(objections, [&indices](const change::Objection& each) {
        return std::ranges::find(indices, each.change) == indices.end();
    });
    return objections;
}

}  // namespace cvagent
