#pragma once

#include "agent/history/database.h"

namespace cvagent {

/// Whether the file has been prepared; one that has nothing in it has not. Throws HistoryError for the file
/// of a later version of this program (newer) or of another program (foreign).
bool hasSchema(const Database& database);

/// Brings an empty file, or one of an earlier version, to the schema of this version. All of it or nothing.
/// @param last in an empty file numbers begin behind this one
void migrate(const Database& database, std::uint64_t last);

}  // namespace cvagent
