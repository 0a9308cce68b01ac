#pragma once

#include <map>
#include <string>

#include "mi/shut_down.h"

namespace IC {

/// Writes an interface's settings as key=value lines into /opt/vantrel/corvista/data/ifcfg-<name>, whatever
/// data directory the agent uses: the files' readers know only that place. A value's trailing line breaks are
/// cut. A file that cannot be opened is logged, and so is a name that would lead out of that place: nothing
/// is written then. deleteSavedConfigurations removes all of them, and nothing else.
void createSettingData(std::string name, std::map<std::string, std::string> settings);

}  // namespace IC
