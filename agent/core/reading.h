#pragma once

#include <chrono>
#include <optional>
#include <string>
#include <vector>

#include "agent/core/catalogue.h"
#include "framework/ic/error.h"

namespace cvagent {

/// What reading one property gave.
struct Reading {
    unsigned int id = 0;
    const Property* row = nullptr;  ///< null: the catalogue does not know the property
    IC::PropertyValue value;
    std::string error;      ///< empty when the read succeeded
    bool missing = false;   ///< it failed because the node has no such property
    bool timedOut = false;  ///< it failed because the host or a device did not answer in time
    /// The value is the last one that is known, and the host may have another one by now.
    bool stale = false;
    /// When the value was what the host said; nothing when it is not known.
    std::optional<std::chrono::steady_clock::time_point> asOf{};

    bool failed() const { return !error.empty(); }
    /// Why there is no value, for people: a property that every node of the class could have is just not
    /// known here, or not told to this user.
    std::string complaint() const;
    std::string name() const { return row != nullptr ? row->name : std::to_string(id); }
};

/// Who is asked for a property.
enum class Source {
    plugin,
    host,  ///< and the plug-in only where it would ask the host itself (oshw/start_facts.h)
};

/// Reads one property, on the calling thread. Never throws for what a read does.
Reading readProperty(const IC::MutableNode& node, unsigned int id, Source source = Source::plugin);

/// The stored properties as readings; nothing is asked of the host.
std::vector<Reading> storedReadings(const IC::MutableNode& node);

/// The text of an error for people; never empty.
std::string errorText(const IC::Error& error);

}  // namespace cvagent
