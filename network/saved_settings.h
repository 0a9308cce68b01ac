#pragma once

#include <map>
#include <string>

namespace IC {

/// Writes an interface's settings as key=value lines into /opt/vantrel/corvista/data/ifcfg-<name>, whatever
/// data directory the agent uses: the files' readers know only that place. A value's trailing line breaks are
/// cut. A file that cannot be opened is logged, and so is a name that would lead out of that place: nothing
/// is written then.
void createSettingData(std::string name, std::map<std::string, std::string> settings);

/// Removes the saved settings of every interface, and nothing else.
void deleteSavedConfigurations();

}  // namespace IC
