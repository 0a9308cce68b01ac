#pragma once

#include <string>
#include <vector>

#include "agent/change/change_file.h"
#include "agent/change/checks.h"
#include "agent/change/standing.h"
#include "agent/cli/options.h"
#include "agent/cli/session.h"

namespace cvagent {

/// A change whose words mean something on this host.
struct MeantChange {
    NodeRef node;
    const Property* row = nullptr;
    std::vector<std::string> words;
    IC::PropertyValue value;
    std::string place;  ///< in its file; "" for one that was typed

    std::string target() const { return node->getPath() + " " + row->name; }
    change::Wanted wanted() const;
};

/// The text of the file of changes that the options name, "-" for standard input; to be read before the
/// process leaves the directory that it was started in. Throws Failure.
std::string readChangeFile(const std::string& file);

/// What the options name: a file of changes, or one that was typed. Throws Failure or Problem, with the place
/// of the first one that means nothing or is not accepted.
std::vector<MeantChange> meantChanges(Session& session, const Options& options);

/// Of all together; indices are those of the list.
std::vector<change::Objection> objectionsTo(const std::vector<MeantChange>& changes);

/// Refuses them with the reasons, unless they are forced, which is told.
void refuseUnlessForced(const std::vector<MeantChange>& changes,
                        const std::vector<change::Objection>& objections, bool force);

/// Asks a person before the host stops, unless he has said yes.
void confirmDrastic(const std::vector<MeantChange>& changes, const Options& options);

/// How the host stands to a change now.
struct Found {
    Reading reading;
    change::Standing standing;
};
Found findNow(Session& session, const MeantChange& change, const Request& request);

}  // namespace cvagent
