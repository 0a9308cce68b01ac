#include "plugins/hardware/hardware_mi.h"

#include <set>

namespace hardware {

HardwareMI::HardwareMI(Host host) : host_(std::move(host)) {}

HardwareMI::~HardwareMI() = default;

IC::Error HardwareMI::initialize(unsigned int miId, const IC::Number& ownNodeId,
                                 const IC::Number& firstNodeId) {
    if (IC::Error failure = unload();
        failure.getStatus() != 0) {  // an agent that starts twice without a stop
        return failure;
    }
    if (IC::Error failure = ManagementInterface::initialize(miId, ownNodeId, firstNodeId);
        failure.getStatus() != 0) {
        return failure;
    }
    const std::lock_guard lock(guard_);
    asking_ = std::make_shared<Asking>(host_);
    if (host_.live()) {  // before the look, so that nothing comes between; its first call waits for the guard
        watcher_ = std::make_unique<Watcher>([this](const std::string& subsystem) { lookAgain(subsystem); });
    }
    appendNode(new IC::MutableNode(ownNodeId, 0, miIds(), static_cast<unsigned int>(Class::hardware), 0));
    for (const Source& source : sources()) {
        look(source, Moment::start);
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
    const auto all = sources();
    for (auto source = all.rbegin(); source != all.rend(); ++source) {  // what hangs under others goes first
        if (concerned(*source)) {
            withdrawGone(*source);
        }
    }
    for (const Source& source : all) {
        if (concerned(source)) {
            look(source, Moment::later);
        }
    }
}

void HardwareMI::withdrawGone(const Source& source) {
    const std::vector<std::string> names = source.list(host_);
    const std::set<std::string> there(names.begin(), names.end());
    std::erase_if(nodes_, [&](const auto& entry) {
        const auto& [key, node] = entry;
        const bool gone = key.first == source.type && !there.contains(key.second);
        if (gone) {
            deleteNode(node);
        }
        return gone;
    });
}

void HardwareMI::look(const Source& source, Moment moment) {
    const std::vector<std::string> names = source.list(host_);
    const std::vector<std::optional<Known>> all = ask(asking_, source, names);
    for (std::size_t place = 0; place < names.size(); ++place) {
        const std::optional<Known>& known = all[place];
        const auto node = nodes_.find({source.type, names[place]});
        if (node == nodes_.end()) {
            this->place(source, known.value_or(Known{nameOnly(source.type, names[place])}), moment);
        } else if (known) {
            node->second->setParent(parentOf(known->found));
            node->second->store(*known);
        }
    }
}

unsigned int HardwareMI::parentOf(const Found& found) const {
    const auto parent = found.parent ? nodes_.find(*found.parent) : nodes_.end();
    return parent == nodes_.end() ? ownNodeId() : parent->second->getNodeId();
}

void HardwareMI::place(const Source& source, const Known& known, Moment moment) {
    const Found& found = known.found;
    const HardwareNode::Place where{takeNodeId(), parentOf(found), miIds(), ++count_[source.type]};
    auto node = std::make_unique<HardwareNode>(where, source, found.name, asking_);
    node->store(known);
    HardwareNode* const placed = node.get();
    if (moment == Moment::start) {
        appendNode(node.release());
    } else {
        addNewNode(node.release());
    }
    nodes_[{source.type, found.name}] = placed;
}

}  // namespace hardware
