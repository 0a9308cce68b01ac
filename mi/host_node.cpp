#include "mi/host_node.h"

namespace IC {

const Property* NodeClass::find(unsigned int id) const {
    const auto row = std::ranges::lower_bound(properties, id, {}, &Property::id);
    return row != properties.end() && row->id == id ? &*row : nullptr;
}

HostNode::HostNode(const NodeClass& nodeClass, unsigned int nodeId, unsigned int linkedId,
                   std::vector<unsigned int> miIds, unsigned int nodeType, unsigned int index,
                   std::string name)
    : MutableNode(nodeId, linkedId, std::move(miIds), nodeType, index),
      class_(nodeClass),
      name_(std::move(name)) {
    const LogScope scope = enter(class_.name());
}

HostNode::~HostNode() {
    const LogScope scope = enter(class_.destructor);
}

Error HostNode::getProperty(unsigned int id, PropertyValue& out) const {
    const LogScope scope = enter();
    const Property* row = class_.find(id);
    if (row == nullptr || row->read == nullptr) {
        return MutableNode::getProperty(id, out);
    }
    if (PropertyValue now = row->read(name_); now.kind() != PropertyValue::none) {
        out = std::move(now);
    }
    return {};
}

Error HostNode::setProperty(const unsigned int& id, const PropertyValue& value) {
    const LogScope scope = enter();
    return store(id, value);
}

}  // namespace IC
