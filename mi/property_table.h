#pragma once

#include <algorithm>
#include <iterator>
#include <string>
#include <vector>

#include "framework/ic/mutable_node.h"

namespace IC {

/// A value on its way to the host. When it has been acted on, the node stores it.
struct Change {
    const MutableNode& node;
    const std::string& name;  ///< the node's: the interface, the device
    const PropertyValue& value;
    std::string mac = {};  ///< hardware address of an interface; "" for other nodes
    bool isStored = true;  ///< cleared by a write whose value is read from the host, or is but a request

    std::string text() const { return static_cast<std::string>(value); }
    unsigned int number() const { return static_cast<unsigned int>(value); }
    std::vector<std::string> texts() const { return static_cast<std::vector<std::string>>(value); }
    /// What the node says of another property now.
    std::string current(unsigned int id) const {
        PropertyValue now;
        node.getProperty(id, now);
        return static_cast<std::string>(now);
    }
};

/// One property that a node class asks the host for, or acts on, itself. Every other id is the framework's:
/// it answers with what was stored last.
struct Property {
    unsigned int id;
    /// Asks the host about the node of this name. Null: what was stored is the answer. A value of kind none
    /// says that the host told nothing.
    PropertyValue (*read)(const std::string& name);
    /// Changes the host. Null: the value is only stored.
    void (*write)(Change& change) = nullptr;
    /// `write` acts only while the interface has its address from its file; until then the value is stored.
    bool needsFixedOrigin = false;
};

/// Whether the ids of a table go up, none twice. For a static_assert below each table.
template <class Table>
constexpr bool idsAscend(const Table& table) {
    return std::ranges::adjacent_find(table, std::ranges::greater_equal(), &Property::id) == std::end(table);
}

}  // namespace IC
