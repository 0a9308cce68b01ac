#include "agent/service/model.h"

#include <algorithm>
#include <set>
#include <utility>

#include "agent/service/names.h"
#include "agent/service/values.h"

namespace cvagent::service {

namespace {

bool tellsTheSame(const Reading& one, const Reading& other) {
    return isKnown(one) == isKnown(other) && (!isKnown(one) || one.value == other.value);
}

const Reading* findReading(const std::vector<Reading>& readings, unsigned int property) {
    const auto found = std::ranges::lower_bound(readings, property, {}, &Reading::id);
    return found != readings.end() && found->id == property ? &*found : nullptr;
}

bool isOlder(const Reading& one, const Reading& other) {
    return one.asOf && other.asOf && *one.asOf < *other.asOf;
}

/// What is known, in place of an older reading. That the host has told nothing in time holds for it, too.
Reading keptBeside(const Reading& known, const Reading& older) {
    Reading kept = known;
    kept.stale = kept.stale || older.stale;
    return kept;
}

/// The readings of a look, but those that a call has brought since as they were; where it was at some
/// properties, the others as they were, too.
std::vector<Reading> merged(const NodeView& look, const std::vector<Reading>& before) {
    std::vector<Reading> all = look.readings;
    for (Reading& reading : all) {
        if (const Reading* known = findReading(before, reading.id);
            known != nullptr && isOlder(reading, *known)) {
            reading = keptBeside(*known, reading);
        }
    }
    if (!look.asked.empty()) {
        for (const Reading& reading : before) {
            if (!std::ranges::binary_search(look.asked, reading.id)) {
                all.push_back(reading);
            }
        }
        std::ranges::sort(all, {}, &Reading::id);
    }
    return all;
}

}  // namespace

const Reading* NodeView::find(unsigned int property) const {
    return findReading(readings, property);
}

void Model::apply(Look look) {
    std::erase_if(gone_, [&look](const auto& entry) { return entry.second < look.number; });
    const std::set<std::uint32_t> listed(look.order.begin(), look.order.end());
    std::vector<std::uint32_t> lost;
    for (const auto& [id, view] : nodes_) {
        if (!listed.contains(id)) {
            lost.push_back(id);
        }
    }
    for (const std::uint32_t id : lost) {
        remove(id);
    }
    for (NodeView& view : look.nodes) {
        if (gone_.contains(view.id)) {
            continue;
        }
        const auto known = nodes_.find(view.id);
        if (known == nodes_.end()) {
            add(std::move(view));
        } else {
            replace(known->second, std::move(view));
        }
    }
    order_ = std::move(look.order);
}

std::string Model::freeObject(const NodeView& view) const {
    std::string object = objectOf(view.path);
    while (objects_.contains(object)) {
        object += "_" + std::to_string(view.id);
    }
    return object;
}

void Model::add(NodeView view) {
    view.object = freeObject(view);
    objects_.emplace(view.object, view.id);
    const auto [place, isNew] = nodes_.emplace(view.id, std::move(view));
    listener_.nodeAdded(place->second);
}

void Model::replace(NodeView& known, NodeView view) {
    if (known.path != view.path) {  // its object has another name, which is another object to the bus
        remove(known.id);
        add(std::move(view));
        return;
    }
    const bool moved = known.parent != view.parent;
    const bool described = known.description != view.description;
    const bool stated = known.status != view.status;
    known.node = view.node;  // a plug-in that was started anew has another one
    known.parent = view.parent;
    known.status = view.status;
    known.description = std::move(view.description);
    const std::vector<Reading> before = std::move(known.readings);
    known.readings = merged(view, before);
    known.readAt = view.readAt;
    for (const auto& [differs, name] :
         {std::pair(moved, "Parent"), std::pair(described, "Description"), std::pair(stated, "Status")}) {
        if (differs) {
            listener_.nodePropertyChanged(known, name);
        }
    }
    for (const Reading& reading : known.readings) {
        const Reading* old = findReading(before, reading.id);
        if (old != nullptr ? !tellsTheSame(*old, reading) : isKnown(reading)) {
            listener_.propertyChanged(known, propertyNameOf(reading.id, reading.row));
        }
    }
    for (const Reading& reading : before) {
        if (isKnown(reading) && known.find(reading.id) == nullptr) {
            listener_.propertyChanged(known, propertyNameOf(reading.id, reading.row));
        }
    }
}

void Model::remove(std::uint32_t id) {
    const auto place = nodes_.find(id);
    if (place == nodes_.end()) {
        return;
    }
    const auto node = nodes_.extract(place);
    objects_.erase(node.mapped().object);
    listener_.nodeRemoved(node.mapped());
}

void Model::withdraw(std::uint32_t id, std::uint64_t begun) {
    gone_[id] = begun;
    remove(id);
}

void Model::takeReading(NodeView& view, const Reading& reading) {
    const auto place = std::ranges::lower_bound(view.readings, reading.id, {}, &Reading::id);
    if (place == view.readings.end() || place->id != reading.id) {
        return;  // what a look does not show is nobody's to see here
    }
    if (isOlder(reading, *place)) {
        *place = keptBeside(*place, reading);
        return;
    }
    const bool same = tellsTheSame(*place, reading);
    *place = reading;
    if (!same) {
        listener_.propertyChanged(view, propertyNameOf(reading.id, reading.row));
    }
}

void Model::learn(std::uint32_t id, const std::vector<Reading>& readings) {
    const auto known = nodes_.find(id);
    if (known == nodes_.end()) {
        return;
    }
    for (const Reading& reading : readings) {
        if (!reading.failed() || reading.stale) {
            takeReading(known->second, reading);
        }
    }
}

const NodeView* Model::byId(std::uint32_t id) const {
    const auto found = nodes_.find(id);
    return found == nodes_.end() ? nullptr : &found->second;
}

const NodeView* Model::byObject(const std::string& object) const {
    const auto found = objects_.find(object);
    return found == objects_.end() ? nullptr : byId(found->second);
}

std::vector<const NodeView*> Model::all() const {
    std::vector<const NodeView*> views;
    for (const std::uint32_t id : order_) {
        if (const NodeView* view = byId(id)) {
            views.push_back(view);
        }
    }
    return views;
}

std::string Model::parentOf(const NodeView& node) const {
    const NodeView* parent = byId(node.parent);
    return parent != nullptr ? parent->object : kRootObject;
}

void Model::clear() {
    nodes_.clear();
    objects_.clear();
    order_.clear();
}

}  // namespace cvagent::service
