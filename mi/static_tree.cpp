// The fixed upper levels of the tree. The network controller hangs under the chassis and the disk controller,
// with index 1, under the planar: agents know them by these places.
#include <stdexcept>

#include "mi/disk_snapshot.h"
#include "mi/log.h"
#include "mi/node_types.h"
#include "mi/os_hw_mi.h"

namespace IC {

namespace {

void describe(MutableNode& node, const char* description) {
    node.setStatus(kStatusGood);
    node.setDescription(description);
}

}  // namespace

MutableNode* OsHwMI::createStaticNode(const MutableNode* parent, unsigned int type, unsigned int index,
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

void OsHwMI::createOsHwNodes() {
    const LogScope scope;
    auto* node = new MutableNode(ownNodeId(), 0, miIds(), NodeType::osHardware, 0);
    appendNode(node);
    tree_.osHw = node;
    describe(*node, "OsHw Management Interface");
}

void OsHwMI::createRootNode() {
    const LogScope scope("Node::ROOT: start", "Node::ROOT: end");
    tree_.root = createStaticNode(tree_.osHw, NodeType::root, 0, "ROOT Node");
}

void OsHwMI::createChassisNodes() {
    const LogScope scope;
    // The chassis keeps the framework's default status and description.
    tree_.chassis = createStaticNode(tree_.computer, NodeType::chassis, 0, nullptr);
}

void OsHwMI::createPlanarNodes() {
    const LogScope scope;
    tree_.planar = createStaticNode(tree_.chassis, NodeType::planar, 0, "Planar");
}

void OsHwMI::createNetworkControllerNodes() {
    const LogScope scope;
    tree_.networkController =
        createStaticNode(tree_.chassis, NodeType::networkController, 0, "Network Controller");
}

void OsHwMI::createDiskControllerNodes() {
    const LogScope scope;
    tree_.diskController = createStaticNode(tree_.planar, NodeType::diskController, 1, "Disk Controller");
    if (!takeDiskSnapshot()) {
        log(kError) << "Command : " << diskSnapshotCommand << " failed!!";
    }
}

}  // namespace IC
