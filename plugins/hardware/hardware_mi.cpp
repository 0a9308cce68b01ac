#include "plugins/hardware/hardware_mi.h"

#include <algorithm>
#include <ranges>

namespace hardware {

HardwareMI::HardwareMI(Host host) : host_(std::move(host)) {}

HardwareMI::~HardwareMI() = default;

IC::Error HardwareMI::initialize(unsigned int miId, const IC::Number& ownNodeId,
                                 const IC::Number& firstNodeId) {
    watcher_.reset();
    if (IC::Error failure = ManagementInterface::initialize(miId, ownNodeId, firstNodeId);
        failure.getStatus() != 0) {
        return failure;
    }
    {
        const std::lock_guard lock(guard_);
        asking_ = std::make_shared<Asking>(host_);
        appendNode(new IC::MutableNode(ownNodeId, 0, miIds(), static_cast<unsigned int>(Class::hardware), 0));
        for (const Source& source : sources()) {
            look(source, Moment::start);
        }
    }
    if (host_.live()) {
        watcher_ = std::make_unique<Watcher>([this](const std::string& subsystem) { lookAgain(subsystem); });
    }
    return {};
}

IC::Error HardwareMI::unload() {
    watcher_.reset();
    const std::lock_guard lock(guard_);
    nodes_.clear();
    count_.clear();
    asking_.reset();
    return ManagementInterface::unload();
}

void HardwareMI::lookAgain(const std::string& subsystem) {
    const std::lock_guard lock(guard_);
    if (asking_ == nullptr) {
        return;
    }
    const auto concerned = [&](const Source& source) {
        return subsystem.empty() || source.subsystem == subsystem;
    };
    for (const Source& source : std::views::reverse(sources())) {  // what hangs under others goes first
        if (concerned(source)) {
            withdrawGone(source, source.list(host_));
        }
    }
    for (const Source& source : sources()) {
        if (concerned(source)) {
            look(source, Moment::later);
        }
    }
}

void HardwareMI::withdrawGone(const Source& source, const std::vector<std::string>& names) {
    std::erase_if(nodes_, [&](const auto& entry) {
        const auto& [key, node] = entry;
        const bool gone = key.first == source.type && std::ranges::find(names, key.second) == names.end();
        if (gone) {
            deleteNode(node);
        }
        return gone;
    });
}

void HardwareMI::look(const Source& source, Moment moment) {
    for (const std::string& name : source.list(host_)) {
        const std::optional<Found> found = ask(asking_, source, name);
        const auto known = nodes_.find({source.type, name});
        if (known == nodes_.end()) {
            place(source, found.value_or(nameOnly(source.type, name)), moment);
        } else if (found) {
            known->second->store(*found);
        }
    }
}

unsigned int HardwareMI::parentOf(const Found& found) const {
    const auto parent = found.parent ? nodes_.find(*found.parent) : nodes_.end();
    return parent == nodes_.end() ? ownNodeId() : parent->second->getNodeId();
}

void HardwareMI::place(const Source& source, const Found& found, Moment moment) {
    const HardwareNode::Place where{takeNodeId(), parentOf(found), miIds(), ++count_[source.type]};
    auto node = std::make_unique<HardwareNode>(where, source, found.name, asking_);
    node->store(found);
    HardwareNode* const placed = node.get();
    if (moment == Moment::start) {
        appendNode(node.release());
    } else {
        addNewNode(node.release());
    }
    nodes_[{source.type, found.name}] = placed;
}

}  // namespace hardware
