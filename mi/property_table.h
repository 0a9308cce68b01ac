#pragma once

#include <algorithm>
#include <functional>
#include <iterator>

#include "framework/ic/mutable_node.h"

namespace IC {

/// One property that a node class asks the host for, or acts on, itself. Every other id is the framework's:
/// it answers with what was stored last.
template <class NodeT>
struct Property {
    unsigned int id;
    const char* name;
    /// Asks the host. Null: what was stored is the answer.
    Error (*read)(const NodeT& node, PropertyValue& out);
    /// Changes the host. Null: the value is only stored.
    Error (*write)(NodeT& node, const PropertyValue& value) = nullptr;
};

/// Whether the ids of a table go up, none twice. For a static_assert below each table.
template <class Table>
constexpr bool idsAscend(const Table& table) {
    return std::ranges::adjacent_find(table, [](const auto& left, const auto& right) {
               return left.id >= right.id;
           }) == std::end(table);
}

/// The row of `id` in a table whose ids ascend; null when the id is the framework's.
template <class Table>
constexpr auto findProperty(const Table& table, unsigned int id) -> decltype(std::data(table)) {
    const auto row =
        std::ranges::lower_bound(table, id, std::ranges::less{}, [](const auto& entry) { return entry.id; });
    return row != std::end(table) && row->id == id ? &*row : nullptr;
}

/// Status 0 or 1, without a code and a text.
inline Error result(bool good) {
    return {good ? Error::success : Error::failure, Number(), ""};
}

}  // namespace IC
