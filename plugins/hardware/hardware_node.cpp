#include "plugins/hardware/hardware_node.h"

#include <algorithm>
#include <utility>

namespace hardware {

namespace {

constexpr std::chrono::milliseconds kFresh{500};

bool isLive(const Source& source, Id id) {
    return std::any_of(source.rows.begin(), source.rows.end(),
                       [id](const Row& row) { return row.id == id && row.live; });
}

IC::Error noAnswer() {
    return {IC::Error::unanswered, IC::Number(), "the device did not answer in time"};
}

}  // namespace

Found nameOnly(Class type, const std::string& name) {
    Found found{type, name};
    if (classRow(type).several) {
        found.facts.text(firstId(type), name);
    }
    return found;
}

std::vector<std::optional<Known>> ask(const std::shared_ptr<Asking>& asking, const Source& source,
                                      const std::vector<std::string>& names) {
    // Owned by the work, too: what hangs fills its own in when nobody waits for it any more.
    const auto all = std::make_shared<std::vector<Known>>();
    std::vector<std::string> devices;
    for (const std::string& name : names) {
        all->push_back({nameOnly(source.type, name)});
        devices.push_back(std::to_string(static_cast<unsigned int>(source.type)) + ":" +
                          (source.device == nullptr ? name : source.device(name)));
    }
    // Not the asking itself: its end waits for this work.
    const auto describe = [all, host = asking->host, &source](std::size_t place) {
        Known& one = (*all)[place];
        one.asOf = std::chrono::steady_clock::now();
        source.describe(host, one.found);
    };
    const std::vector<bool> answered = asking->patience.runAll(std::move(devices), describe);
    std::vector<std::optional<Known>> known(names.size());
    for (std::size_t place = 0; place < names.size(); ++place) {
        if (answered[place]) {
            known[place] = std::move((*all)[place]);
        }
    }
    return known;
}

HardwareNode::HardwareNode(const Place& place, const Source& source, std::string name,
                           std::shared_ptr<Asking> asking)
    : MutableNode(place.id, place.parent, place.owners, static_cast<unsigned int>(source.type), place.index),
      source_(source),
      name_(std::move(name)),
      asking_(std::move(asking)),
      known_{{source.type, name_}, {}} {}

void HardwareNode::store(const Known& known) {
    setDescription(known.found.description);
    takeOver(known);
}

void HardwareNode::takeOver(const Known& known) const {
    const std::lock_guard lock(guard_);
    if (known.asOf >= known_.asOf) {
        Known next = known;
        next.found.facts.keepOld(known_.found.facts);
        known_ = std::move(next);
    }
}

bool HardwareNode::isOpen(Id id) const {
    const std::lock_guard lock(guard_);
    return known_.asOf == Known().asOf && !known_.found.facts.all().contains(id);
}

IC::Error HardwareNode::refresh() const {
    {
        const std::lock_guard lock(guard_);
        if (std::chrono::steady_clock::now() - known_.asOf < kFresh) {
            return {};
        }
    }
    const std::optional<Known> known = ask(asking_, source_, {name_}).front();
    if (!known) {
        return noAnswer();
    }
    takeOver(*known);
    return {};
}

IC::Error HardwareNode::getProperty(unsigned int id, IC::PropertyValue& out) const {
    if (isLive(source_, id) || isOpen(id)) {
        if (IC::Error failure = refresh(); failure.getStatus() != 0) {
            return failure;
        }
    }
    const std::lock_guard lock(guard_);
    const Facts& facts = known_.found.facts;
    if (facts.isUnanswered(id)) {
        return noAnswer();
    }
    const auto fact = facts.all().find(id);
    if (fact == facts.all().end()) {
        return {IC::Error::failure, IC::Number(IC::Error::kNoSuchProperty),
                "no such property: " + std::to_string(id)};
    }
    out = fact->second;
    return {};
}

IC::Error HardwareNode::getProperties(std::map<unsigned int, IC::PropertyValue>& out) const {
    const std::lock_guard lock(guard_);
    out = known_.found.facts.all();
    return {};
}

IC::Error HardwareNode::setProperty(const unsigned int& id, const IC::PropertyValue& /*value*/) {
    return {IC::Error::failure, IC::Number(), "property " + std::to_string(id) + " cannot be written"};
}

}  // namespace hardware
