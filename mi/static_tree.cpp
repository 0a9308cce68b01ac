// The fixed upper levels of the tree. The network controller hangs under the chassis and the disk controller,
// with index 1, under the planar: agents know them by these places.
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

MutableNode* OsHwMI::createStaticNode(const MutableNode& parent, unsigned int type, unsigned int index,
                                      const char* description) {
    auto* node = makeNode<MutableNode>(parent, type, index);
    appendNode(node);
    if (description != nullptr) {
        describe(*node, description);
    }
    return node;
}

void OsHwMI::createOsHwNodes() {
    const LogScope scope;
    osHwNode_ = new MutableNode(ownNodeId(), 0, miIds(), NodeType::osHardware, 0);
    appendNode(osHwNode_);
    describe(*osHwNode_, "OsHw Management Interface");
}

void OsHwMI::createRootNode() {
    log(kProgress) << "Node::ROOT: start";
    rootNode_ = createStaticNode(*osHwNode_, NodeType::root, 0, "ROOT Node");
    log(kProgress) << "Node::ROOT: end";
}

void OsHwMI::createChassisNodes() {
    const LogScope scope;
    // The chassis keeps the framework's default status and description.
    chassisNode_ = createStaticNode(*computerNode_, NodeType::chassis, 0, nullptr);
}

void OsHwMI::createPlanarNodes() {
    const LogScope scope;
    planarNode_ = createStaticNode(*chassisNode_, NodeType::planar, 0, "Planar");
}

void OsHwMI::createNetworkControllerNodes() {
    const LogScope scope;
    networkControllerNode_ =
        createStaticNode(*chassisNode_, NodeType::networkController, 0, "Network Controller");
}

void OsHwMI::createDiskControllerNodes() {
    const LogScope scope;
    diskControllerNode_ = createStaticNode(*planarNode_, NodeType::diskController, 1, "Disk Controller");
    if (!takeDiskSnapshot()) {
        log(kError) << "Command : " << diskSnapshotCommand << " failed!!";
    }
}

}  // namespace IC
