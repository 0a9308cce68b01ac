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

}  // namespace

Found nameOnly(Class type, const std::string& name) {
    Found found{type, name};
    if (classRow(type).several) {
        found.facts.text(firstId(type), name);
    }
    return found;
}

std::optional<Found> ask(const std::shared_ptr<Asking>& asking, const Source& source,
                         const std::string& name) {
    const auto found = std::make_shared<Found>(nameOnly(source.type, name));
    const bool answered =
        asking->patience.run(std::to_string(static_cast<unsigned int>(source.type)) + ":" + name,
                             // Not the asking itself: its end waits for this work.
                             [found, host = asking->host, &source] { source.describe(host, *found); });
    return answered ? std::optional(std::move(*found)) : std::nullopt;
}

HardwareNode::HardwareNode(const Place& place, const Source& source, std::string name,
                           std::shared_ptr<Asking> asking)
    : MutableNode(place.id, place.parent, place.owners, static_cast<unsigned int>(source.type), place.index),
      source_(source),
      name_(std::move(name)),
      asking_(std::move(asking)),
      known_{{source.type, name_}, {}} {}

void HardwareNode::store(const Found& found) {
    setDescription(found.description);
    const std::lock_guard lock(guard_);
    known_ = {found, std::chrono::steady_clock::now()};
}

IC::Error HardwareNode::refresh() const {
    {
        const std::lock_guard lock(guard_);
        if (std::chrono::steady_clock::now() - known_.asOf < kFresh) {
            return {};
        }
    }
    const std::optional<Found> found = ask(asking_, source_, name_);
    if (!found) {
        return {IC::Error::unanswered, IC::Number(), "the device did not answer in time"};
    }
    const std::lock_guard lock(guard_);
    known_ = {*found, std::chrono::steady_clock::now()};
    return {};
}

IC::Error HardwareNode::getProperty(unsigned int id, IC::PropertyValue& out) const {
    if (isLive(source_, id)) {
        if (IC::Error failure = refresh(); failure.getStatus() != 0) {
            return failure;
        }
    }
    const std::lock_guard lock(guard_);
    const auto& facts = known_.found.facts.all();
    const auto fact = facts.find(id);
    if (fact == facts.end()) {
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
