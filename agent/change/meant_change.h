#pragma once

#include <string>
#include <vector>

#include "agent/change/change_file.h"
#include "agent/change/changed_host.h"
#include "agent/change/checks.h"
#include "agent/change/standing.h"

namespace cvagent::change {

/// A change whose words mean something on this host.
struct MeantChange {
    NodeRef node;
    const Property* row = nullptr;
    std::vector<std::string> words;
    IC::PropertyValue value;
    std::string place;  ///< in its list; "" for one that was typed

    std::string target() const { return node->getPath() + " " + row->name; }
    Wanted wanted() const;
    /// The label of a value that stops the host; null for any other.
    const Label* drastic() const;
};

/// Throws Problem with the place of the first one that means nothing or is not accepted, and BadChangeFile
/// for one that stands there twice.
std::vector<MeantChange> meantChanges(ChangedHost& host, const std::vector<NamedChange>& named);

/// What speaks against all together; indices are those of the list.
std::vector<Objection> objectionsTo(const std::vector<MeantChange>& changes);

/// How the host stands to a change now.
struct Found {
    Reading reading;
    Standing standing;
};
Found findNow(ChangedHost& host, const MeantChange& change, const Request& request);

}  // namespace cvagent::change
