#pragma once

#include <cstdint>
#include <map>
#include <string>
#include <vector>

#include "agent/core/agent.h"

namespace cvagent::service {

/// A node as it was when it was last looked at.
struct NodeView {
    NodeRef node;
    std::uint32_t id;
    std::uint32_t parent;
    std::uint32_t type;
    std::uint32_t index;
    std::uint32_t status;
    std::string nodeClass;
    std::string interface;
    std::string path;
    std::string object;  ///< given by the model
    std::string description;
    std::vector<Reading> readings;  ///< ids ascending
    std::uint64_t readAt;           ///< microseconds since 1970
    /// Of a look: the properties that were asked for, ascending; none: all, and the readings are all there
    /// is.
    std::vector<unsigned int> asked{};

    /// Null for none.
    const Reading* find(unsigned int property) const;
};

/// What a look at the host has brought.
struct Look {
    std::uint64_t number = 0;          ///< of looks, in the order in which they began
    bool whole = false;                ///< it was at all nodes
    std::vector<std::uint32_t> order;  ///< all nodes that were there, in the order of the plug-ins' lists
    std::vector<NodeView> nodes;       ///< those that were looked at
};

/// Hears of what has become different.
class ModelListener {
public:
    virtual ~ModelListener() = default;
    virtual void nodeAdded(const NodeView& node) = 0;
    virtual void nodeRemoved(const NodeView& node) = 0;
    /// @param property by its name on the bus
    virtual void propertyChanged(const NodeView& node, const std::string& property) = 0;
    /// Of com.vantrel.Corvista1.Node.
    virtual void nodePropertyChanged(const NodeView& node, const char* property) = 0;
};

/// The nodes and their values as last known. It asks nobody. One thread.
class Model {
public:
    /// @param listener outlives it
    explicit Model(ModelListener& listener) : listener_(listener) {}

    void apply(Look look);
    /// A node is listed no more.
    /// @param begun number of the last look that has begun: that one can still bring the node
    void withdraw(std::uint32_t id, std::uint64_t begun);
    /// What a read has brought besides.
    void learn(std::uint32_t id, const std::vector<Reading>& readings);

    // Null for none.
    const NodeView* byId(std::uint32_t id) const;
    const NodeView* byObject(const std::string& object) const;
    /// In the order of the plug-ins' lists.
    std::vector<const NodeView*> all() const;
    /// By their objects' paths.
    const std::map<std::string, std::uint32_t>& objects() const { return objects_; }
    /// The object of a node's parent; the root object where it has none.
    std::string parentOf(const NodeView& node) const;
    void clear();

private:
    void add(NodeView view);
    void replace(NodeView& known, NodeView view);
    void remove(std::uint32_t id);
    void takeReading(NodeView& view, const Reading& reading);
    std::string freeObject(const NodeView& view) const;

    ModelListener& listener_;
    std::map<std::uint32_t, NodeView> nodes_;
    std::map<std::string, std::uint32_t> objects_;
    std::vector<std::uint32_t> order_;
    std::map<std::uint32_t, std::uint64_t> gone_;  // which a look that had begun by then can still bring
};

}  // namespace cvagent::service
