#include "agent/change/meant_change.h"

#include <algorithm>
#include <iterator>
#include <set>
#include <utility>

#include "agent/change/interface_settings.h"
#include "agent/core/property_words.h"
#include "agent/core/text.h"

namespace cvagent::change {

namespace {

std::string withPlace(const NamedChange& named, const std::string& text) {
    return named.place.empty() ? text : named.place + ": " + text;
}

MeantChange meant(ChangedHost& host, const NamedChange& named) {
    try {
        MeantChange change{host.find(named.node), nullptr, named.words, {}, named.place};
        change.row = &writableRow(*change.node, named.property);
        change.value = acceptedValue(*change.row, named.words);
        return change;
    } catch (const Problem& problem) {
        throw Problem(problem.kind(), withPlace(named, problem.what()), problem.subject(), problem.detail());
    }
}

}  // namespace

/// In one spelling, codes as numbers.
Wanted MeantChange::wanted() const {
    const std::vector<std::string>* list = value.asTexts();
    const auto plain = list != nullptr ? *list : std::vector<std::string>{static_cast<std::string>(value)};
    return {row->id, plain, row->type == NodeType::ipConfig ? interfaceNameOf(*node) : "",
            row->type == NodeType::computer};
}

const Label* MeantChange::drastic() const {
    return drasticLabel(*row, value);
}

std::vector<MeantChange> meantChanges(ChangedHost& host, const std::vector<NamedChange>& named) {
    std::vector<MeantChange> changes;
    std::set<std::pair<unsigned int, unsigned int>> known;
    for (const NamedChange& each : named) {
        changes.push_back(meant(host, each));
        const MeantChange& last = changes.back();
        if (!known.insert({last.node->getNodeId(), last.row->id}).second) {
            throw BadChangeFile(withPlace(each, printable(last.target()) + " stands in the file twice"));
        }
    }
    return changes;
}

std::vector<Objection> objectionsTo(const std::vector<MeantChange>& changes) {
    std::vector<Wanted> wanted;
    std::ranges::transform(changes, std::back_inserter(wanted), &MeantChange::wanted);
    return objectionsTo(wanted, HostFacts::of(wanted));
}

Found findNow(ChangedHost& host, const MeantChange& change, const Request& request) {
    Found found;
    found.reading.id = change.row->id;
    found.reading.row = change.row;
    found.reading.error = "it can only be written";
    if (change.row->readable) {
        const std::vector<Reading> readings =
            host.read(change.node, {std::to_string(change.row->id)}, request);
        found.reading = readings.empty() ? found.reading : readings.front();
        found.reading.row = change.row;
    }
    found.standing = standingOf(*change.node, *change.row, change.value, found.reading);
    return found;
}

}  // namespace cvagent::change
