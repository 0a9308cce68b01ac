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
    bool timedOut = false;  ///< it failed because a command of the host did not end in time
    /// The value is the last one that is known, and the host may have another one by now.
    bool stale = false;
    /// When the value was what the host said; nothing when it is not known.
    std::optional<std::chrono::steady_clock::time_point> asOf{};

    bool failed() const { return !error.empty(); }
    /// Why there is no value, for people: a property that every node of the class could have is just not
    /// known here.
    std::string complaint() const {
        return missing && row != nullptr ? "not known" : "not known (" + error + ")";
    }
    std::string name() const { return row != nullptr ? row->name : std::to_string(id); }
};

/// Reads one property through the plug-in, on the calling thread. Never throws for what a read does.
Reading readProperty(const IC::MutableNode& node, unsigned int id);

/// The stored properties as readings; nothing is asked of the host.
std::vector<Reading> storedReadings(const IC::MutableNode& node);

/// The text of an error for people; never empty.
std::string errorText(const IC::Error& error);

}  // namespace cvagent
