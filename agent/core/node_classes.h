#pragma once

#include <map>
#include <memory>
#include <span>
#include <string>
#include <vector>

#include "framework/ic/mutable_node.h"

namespace cvagent {

/// A handle: the node lives at least as long, whatever the plug-in withdraws meanwhile. One that a management
/// interface gives must go before the plug-in, for the node's code goes with it; one inside a NodeRef keeps
/// the plug-in, too.
using Handle = std::shared_ptr<IC::MutableNode>;
using Properties = std::map<unsigned int, IC::PropertyValue>;

// The node classes, by the type number the plug-in gives them. The numbers are one list for all plug-ins; a
// further one has classes of its own, written NodeType{301}.
enum class NodeType : unsigned int {
    chassis = 1,
    processor = 4,
    hardDrive = 11,
    networkPort = 12,
    ipConfig = 29,
    osHardware = 38,
    computer = 40,
    planar = 41,
    partition = 45,
    networkController = 49,
    diskController = 50,
    team = 56,
    root = 59,
    lanEndpoint = 73,
};

struct NodeClass {
    NodeType type;
    const char* name;
    enum class Naming { single, byIndex, byProperty } naming;
    unsigned int nameProperty;  ///< the property that holds the node's name
    /// The properties that tell the nodes of the class apart at a glance.
    std::span<const unsigned int> telling{};
    bool everywhere = false;  ///< every host has nodes of the class
    /// The properties whose stored value can be another one than a read gives.
    std::span<const unsigned int> live{};
};

/// All classes, in the order in which the tree and the catalogue show them.
std::vector<NodeClass> nodeClasses();
/// Null for a type number that is none of ours.
const NodeClass* findClass(unsigned int nodeType);
const NodeClass* findClass(const std::string& name);
/// "network-port"; "type-99" for a node of a class that is none of ours.
std::string className(unsigned int nodeType);

/// What the plug-in has stored in the node; nothing is asked of the host.
Properties storedProperties(const IC::MutableNode& node);
/// The node's part of a path: the class, with ":name" behind it where there can be several.
std::string pathComponent(const IC::MutableNode& node);

}  // namespace cvagent
