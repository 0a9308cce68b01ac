#pragma once

#include <string>
#include <vector>

#include "agent/change/apply.h"
#include "agent/cli/options.h"
#include "agent/cli/session.h"

namespace cvagent {

/// The text of the file of changes that the options name, "-" for standard input; to be read before the
/// process leaves the directory that it was started in. Throws Failure.
std::string readChangeFile(const std::string& file);

/// What the options name: a file of changes, or one that was typed. Throws Failure.
std::vector<change::NamedChange> namedChanges(const Options& options);
/// The same with what it means on this host. Throws Failure or Problem, with the place of the first one that
/// means nothing or is not accepted.
std::vector<change::MeantChange> meantChanges(Session& session, const Options& options);

/// Asks a person before the host stops, unless he has said yes.
void confirmDrastic(const std::vector<change::MeantChange>& changes, const Options& options);

/// How this process tries changes out: as the plug-ins of the options do.
change::RehearsalSettings rehearsalSettings(const Options& options);

}  // namespace cvagent
