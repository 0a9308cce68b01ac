#include "agent/core/node_copy.h"

namespace cvagent {

NodeRef NodeCopy::reference(const std::vector<Reading>& readings) const {
    auto node = std::make_shared<IC::MutableNode>(id, parent, std::vector<unsigned int>(), type, index);
    node->setPath(path);
    node->setDescription(description);
    node->setStatus(status);
    for (const Reading& reading : readings) {
        if (!reading.value.empty()) {
            node->setProperty(reading.id, reading.value);
        }
    }
    return {nullptr, std::move(node)};
}

}  // namespace cvagent
