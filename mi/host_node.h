#pragma once

#include <span>
#include <string>
#include <utility>
#include <vector>

#include "mi/log.h"
#include "mi/property_table.h"

namespace IC {

/// What makes a node class of its own.
struct NodeClass {
    const char* destructor;  ///< "~NetworkPortNode": log lines name it, and behind its first letter the class
    std::span<const Property> properties = {};  ///< by ascending id

    const char* name() const { return destructor + 1; }
    /// Null when the id is the framework's.
    const Property* find(unsigned int id) const;
};

/// The base of all node classes that stand for a thing of the host. Its members write their entry and exit
/// under the name of the class.
class HostNode : public MutableNode {
public:
    ~HostNode() override;

    /// The name of the thing on the host: the interface, the device; "" for the host itself.
    const std::string& name() const { return name_; }
    /// Asks the host where the class's table says so, the store for the rest. Always a success for the
    /// former; when the host tells nothing, `out` stays as it is.
    Error getProperty(unsigned int id, PropertyValue& out) const override;
    /// Stores the value.
    Error setProperty(const unsigned int& id, const PropertyValue& value) override;

protected:
    /// Arguments as for MutableNode.
    HostNode(const NodeClass& nodeClass, unsigned int nodeId, unsigned int linkedId,
             std::vector<unsigned int> miIds, unsigned int nodeType, unsigned int index, std::string name);

    /// Stores the value without a word in the log.
    Error store(unsigned int id, const PropertyValue& value) { return MutableNode::setProperty(id, value); }
    /// The log lines of a member that a class overrides.
    LogScope enter(const char* function = __builtin_FUNCTION(), int line = __builtin_LINE()) const {
        return {ClassName{class_.name()}, function, line};
    }

private:
    const NodeClass& class_;
    const std::string name_;
};

/// The base of the class that `nodeClass` describes.
template <const NodeClass& nodeClass>
class NodeOf : public HostNode {
public:
    NodeOf(unsigned int nodeId, unsigned int linkedId, std::vector<unsigned int> miIds, unsigned int nodeType,
           unsigned int index, std::string name = "")
        : HostNode(nodeClass, nodeId, linkedId, std::move(miIds), nodeType, index, std::move(name)) {}
};

}  // namespace IC
