#pragma once

#include <optional>
#include <string>
#include <vector>

#include "agent/core/node_ref.h"
#include "agent/core/reading.h"
#include "agent/core/writer.h"

namespace cvagent::change {

/// How a value that is wanted and the host stand to each other.
struct Standing {
    WriteResult::Outcome outcome = WriteResult::notKnown;
    std::string reason;  ///< what the host has instead, or why it is not known; "" when applied
};

/// @param value   as acceptedValue made it
/// @param reading of the property, of just now
Standing standingOf(const IC::MutableNode& node, const Property& row, const IC::PropertyValue& value,
                    const Reading& reading);

/// Whether the value is a deed rather than a state: it is done whatever the host is like (a restart, the
/// clock, a look for interfaces).
bool isDeed(const Property& row);

/// The words that would set a value back which was read; nothing where none can: it is a deed, tells
/// something else than is written, or is none that may be written.
std::optional<std::vector<std::string>> wordsToSetBack(const Reading& reading);

/// Whether the property is written only while the interface's origin is a fixed one.
bool needsFixedOrigin(const Property& row);
/// Whether every IP configuration tells the same of it, for it is the host's.
bool isHosts(const Property& row);

}  // namespace cvagent::change
