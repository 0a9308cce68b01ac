#pragma once

#include <optional>
#include <string>
#include <string_view>

namespace cvagent::change {

/// What would reach the host through somebody else, or what no namespace keeps apart, does not run in a
/// rehearsal: programs of ours that do nothing stand in for these.

/// Puts them in front of PATH. They are links to this program below /tmp. Throws Cannot.
/// @param withHostName besides them one that has the host's name set (name_keeper.h)
void putRecordersOnPath(bool withHostName);
/// Runs as one of them when the program was called by such a name.
/// @return the status to end with; nothing when the name is none of theirs
std::optional<int> runAsRecorder(int count, char** words);

/// Whether a command line has such a program in it.
bool isRecorded(std::string_view command);

}  // namespace cvagent::change
