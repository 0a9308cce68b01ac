#include "framework/ic/mutable_node.h"

#include <algorithm>
#include <mutex>
#include <utility>

namespace IC {

MutableNode::MutableNode(unsigned int nodeId, unsigned int linkedId, std::vector<unsigned int> miIds,
                         unsigned int nodeType, unsigned int index)
    : nodeId_(nodeId), nodeType_(nodeType), index_(index), linkedId_(linkedId), miIds_(std::move(miIds)) {}

MutableNode::~MutableNode() = default;

Error MutableNode::getProperty(unsigned int id, PropertyValue& out) const {
    const std::shared_lock lock(guard_);
    const auto found = properties_.find(id);
    if (found == properties_.end()) {
        return {Error::failure, Number(Error::kNoSuchProperty), "no such property: " + std::to_string(id)};
    }
    out = found->second;
    return {};
}

Error MutableNode::getProperties(std::map<unsigned int, PropertyValue>& out) const {
    const std::shared_lock lock(guard_);
    out = properties_;
    return {};
}

Error MutableNode::setProperty(const unsigned int& id, const PropertyValue& value) {
    PropertyValue copy = value;
    const std::unique_lock lock(guard_);
    std::swap(properties_[id], copy);
    return {};
}

MutableNode::operator std::string() const {
    return getPath() + " (type " + std::to_string(nodeType_) + ", id " + std::to_string(nodeId_) + ")";
}

unsigned int MutableNode::getNodeId() const {
    return nodeId_;
}

unsigned int MutableNode::getLinkedId() const {
    const std::shared_lock lock(guard_);
    return linkedId_;
}

unsigned int MutableNode::getIndex() const {
    return index_;
}

std::vector<unsigned int> MutableNode::getMIIds() const {
    const std::shared_lock lock(guard_);
    return miIds_;
}

Error MutableNode::addMI(unsigned int miId) {
    const std::unique_lock lock(guard_);
    if (std::find(miIds_.begin(), miIds_.end(), miId) == miIds_.end()) {
        miIds_.push_back(miId);
    }
    return {};
}

Error MutableNode::delMI(unsigned int miId) {
    const std::unique_lock lock(guard_);
    if (std::erase(miIds_, miId) == 0) {
        return {Error::failure, Number(), "no such management interface: " + std::to_string(miId)};
    }
    return {};
}

Error MutableNode::setStatus(unsigned int status) {
    storeStatus(status);
    return {};
}

Error MutableNode::setDescription(const std::string& description) {
    storeDescription(description);
    return {};
}

Error MutableNode::setPath(const std::string& path) {
    storePath(path);
    return {};
}

Error MutableNode::setParent(unsigned int nodeId) {
    const std::unique_lock lock(guard_);
    linkedId_ = nodeId;
    return {};
}

}  // namespace IC
