// The tree and its fixed upper levels. The network controller hangs under the chassis and the disk
// controller, with index 1, under the planar: agents know them by these places.
#include "mi/node_tree.h"

#include <stdexcept>

#include "mi/disk_snapshot.h"
#include "mi/log.h"
#include "mi/node_types.h"

namespace IC {

namespace {

void describe(MutableNode& node, const char* description) {
    node.setStatus(kStatusGood);
    node.setDescription(description);
}

}  // namespace

MutableNode* NodeTree::createStaticNode(const MutableNode* parent, unsigned int type, unsigned int index,
                                        const char* description) {
    auto* node = makeNode<MutableNode>(parent, type, index);
    appendNode(node);
    if (description != nullptr) {
        describe(*node, description);
    }
    return node;
}

unsigned int idOf(const MutableNode* parent) {
    if (parent == nullptr) {
        throw std::logic_error("the node it hangs under was not made");
    }
    return parent->getNodeId();
}

void NodeTree::createOsHwNodes() {
    const LogScope scope;
    auto* node = new MutableNode(ownNodeId(), 0, miIds(), NodeType::osHardware, 0);
    appendNode(node);
    fixed.osHw = node;
    describe(*node, "OsHw Management Interface");
}

void NodeTree::createRootNode() {
    const LogScope scope("Node::ROOT: start", "Node::ROOT: end");
    fixed.root = createStaticNode(fixed.osHw, NodeType::root, 0, "ROOT Node");
}

void NodeTree::createChassisNodes() {
    const LogScope scope;
    // The chassis keeps the framework's default status and description.
    fixed.chassis = createStaticNode(fixed.computer, NodeType::chassis, 0, nullptr);
}

void NodeTree::createPlanarNodes() {
    const LogScope scope;
    fixed.planar = createStaticNode(fixed.chassis, NodeType::planar, 0, "Planar");
}

void NodeTree::createNetworkControllerNodes() {
    const LogScope scope;
    fixed.networkController =
        createStaticNode(fixed.chassis, NodeType::networkController, 0, "Network Controller");
}

void NodeTree::createDiskControllerNodes() {
    const LogScope scope;
    fixed.diskController = createStaticNode(fixed.planar, NodeType::diskController, 1, "Disk Controller");
    if (!takeDiskSnapshot()) {
        log(kError) << "Command : " << diskSnapshotCommand << " failed!!";
    }
}

void NodeTree::publishNode(Node* node) {
    const LogScope scope;
    const Error result = addNewNode(node);
    if (result.getStatus() != 0) {
        log(kError) << "addNewNode error = " << result;
    }
}

unsigned int NodeTree::drawNodeId() {
    const std::lock_guard lock(inventoryGuard_);
    const unsigned int id = takeNodeId();
    if (keepsInventory_) {
        drawnIds_.push_back(id);
    }
    return id;
}

void NodeTree::rememberByName(const std::string& name, MutableNode* node) {
    const std::lock_guard lock(inventoryGuard_);
    if (keepsInventory_ && nodesByName_[name].expired()) {
        nodesByName_[name] = node->weak_from_this();
    }
}

std::map<std::string, std::shared_ptr<MutableNode>> NodeTree::nodesByName() const {
    std::map<std::string, std::shared_ptr<MutableNode>> held;
    const std::lock_guard lock(inventoryGuard_);
    for (const auto& [name, known] : nodesByName_) {
        if (auto node = known.lock()) {  // the agent has not withdrawn it
            held.emplace(name, std::move(node));
        }
    }
    return held;
}

bool NodeTree::findNetworkPort(std::string name, MutableNode** node) const {
    const auto held = findNetworkPort(name);
    *node = held ? held.get() : *node;
    return held != nullptr;
}

std::shared_ptr<MutableNode> NodeTree::findNetworkPort(const std::string& name) const {
    const LogScope scope;
    const std::lock_guard lock(inventoryGuard_);
    const auto found = nodesByName_.find(name);
    return found == nodesByName_.end() ? nullptr : found->second.lock();
}

void NodeTree::resetInventory(bool keeps) {
    const std::lock_guard lock(inventoryGuard_);
    keepsInventory_ = keeps;
    drawnIds_.clear();
    nodesByName_.clear();
}

}  // namespace IC
