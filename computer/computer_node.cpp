#include "computer/computer_node.h"

#include <utility>

#include "mi/log.h"
#include "mi/node_types.h"
#include "mi/os_hw_mi.h"

namespace IC {

ComputerNode::ComputerNode(unsigned int nodeId, unsigned int linkedId, std::vector<unsigned int> miIds,
                           unsigned int nodeType, unsigned int index)
    : MutableNode(nodeId, linkedId, std::move(miIds), nodeType, index) {
    const LogScope scope("ComputerNode::ComputerNode");
}

ComputerNode::~ComputerNode() {
    const LogScope scope("ComputerNode::~ComputerNode");
}

void OsHwMI::createComputerNodes() {
    const LogScope scope("createComputerNodes");
    auto* computer = makeNode<ComputerNode>(*rootNode_, NodeType::computer, 0);
    computerNode_ = node_ = computer;
    appendNode(computer);
    computer->setStatus(1);
    computer->setDescription("Computer");
}

}  // namespace IC
