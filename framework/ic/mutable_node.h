#pragma once

#include <memory>

#include "framework/ic/node.h"

namespace IC {

/// A node with a store of properties: the base of every node of the plug-in. All operations may be called
/// from many threads at once; none of them calls out while it holds its lock. A management interface owns it
/// through shared handles; the node knows them, so that handing it over twice is harmless.
class CORVISTA_API MutableNode : public Node, public std::enable_shared_from_this<MutableNode> {
public:
    /// @param nodeId   unique among all nodes of the plug-in
    /// @param linkedId id of the node this one hangs under, 0 for none
    /// @param miIds    ids of the management interfaces that own the node
    /// @param nodeType number of the class (59 is the root)
    /// @param index    instance number among nodes of the same type
    MutableNode(unsigned int nodeId, unsigned int linkedId, std::vector<unsigned int> miIds,
                unsigned int nodeType, unsigned int index);

    ~MutableNode() override;
    /// What was stored last; an id that was never stored gives status 1, Error::kNoSuchProperty and "no such
    /// property: <id>", `out` untouched.
    Error getProperty(unsigned int id, PropertyValue& out) const override;
    Error getProperties(std::map<unsigned int, PropertyValue>& out) const override;
    /// Stores a copy.
    Error setProperty(const unsigned int& id, const PropertyValue& value) override;
    operator std::string() const override;
    virtual unsigned int getNodeId() const;
    virtual unsigned int getLinkedId() const;
    virtual unsigned int getIndex() const;
    virtual std::vector<unsigned int> getMIIds() const;
    /// Adds an owner; one that is there already stays as it is.
    virtual Error addMI(unsigned int miId);
    /// Failure when the node has no such owner.
    virtual Error delMI(unsigned int miId);
    virtual Error setStatus(unsigned int status);
    virtual Error setDescription(const std::string& description);
    virtual Error setPath(const std::string& path);
    /// Hangs the node under another one.
    virtual Error setParent(unsigned int nodeId);

    unsigned int nodeType() const { return nodeType_; }

private:
    const unsigned int nodeId_;
    const unsigned int nodeType_;
    const unsigned int index_;
    mutable std::shared_mutex guard_;  // guards everything below
    unsigned int linkedId_;
    std::vector<unsigned int> miIds_;
    std::map<unsigned int, PropertyValue> properties_;
};

}  // namespace IC
