#include "agent/history/schema.h"

#include <iterator>
#include <string>

#include "agent/history/history_error.h"

namespace cvagent {

namespace {

constexpr std::int64_t kOurs = 0x43764873;  // "CvHs", in the file's header

// A step for each version, the first one for the first. A step that was released is never changed.
//
// runs: one for each process that has kept something. entries: numbered once and for all, so a number whose
// entry is gone is not given again. facts: "age" and "bytes" are limits; up to "settled" the plug-ins have
// taken for told what the entries tell.
constexpr const char* kSteps[] = {
    R"sql(
CREATE TABLE runs (
  run INTEGER PRIMARY KEY AUTOINCREMENT,
  boot TEXT NOT NULL,
  began INTEGER NOT NULL
);
CREATE TABLE entries (
  number INTEGER PRIMARY KEY AUTOINCREMENT,
  run INTEGER NOT NULL REFERENCES runs,
  kind TEXT NOT NULL,
  time INTEGER NOT NULL,
  path TEXT NOT NULL,
  message TEXT NOT NULL,
  node INTEGER NOT NULL,
  class TEXT NOT NULL,
  property INTEGER NOT NULL,
  name TEXT NOT NULL,
  before TEXT NOT NULL,
  after TEXT NOT NULL,
  caller TEXT NOT NULL,
  wanted TEXT NOT NULL,
  verdict TEXT NOT NULL,
  first_code INTEGER NOT NULL,
  second_code INTEGER NOT NULL,
  event_code INTEGER NOT NULL
);
CREATE INDEX alerts_of_paths ON entries (path, number) WHERE kind = 'alert';
CREATE TABLE marks (
  uid INTEGER PRIMARY KEY,
  number INTEGER NOT NULL
);
CREATE TABLE facts (
  name TEXT PRIMARY KEY,
  value INTEGER NOT NULL
);
)sql",
    // What a change was foreseen to do, kept with the write that began it.
    "ALTER TABLE entries ADD COLUMN plan TEXT NOT NULL DEFAULT ''",
};
constexpr std::int64_t kVersion = std::size(kSteps);

std::int64_t versionOf(const Database& database) {
    return database.number("PRAGMA user_version");
}

}  // namespace

bool hasSchema(const Database& database) {
    const std::int64_t owner = database.number("PRAGMA application_id");
    const std::int64_t version = versionOf(database);
    if (owner == kOurs && version > kVersion) {
        throw HistoryError(HistoryError::newer, "a later version of this program has written it (form " +
                                                    std::to_string(version) + ", known here up to " +
                                                    std::to_string(kVersion) + ")");
    }
    if (owner == kOurs) {
        return version > 0;
    }
    if (owner != 0 || version != 0 || database.number("SELECT count(*) FROM sqlite_schema") != 0) {
        throw HistoryError(HistoryError::foreign, "it is the file of another program");
    }
    return false;
}

void migrate(const Database& database, std::uint64_t last) {
    const std::int64_t found = versionOf(database);
    if (found == kVersion) {
        return;
    }
    Transaction transaction(database);
    for (std::int64_t version = found; version < kVersion; ++version) {
        database.execute(kSteps[version]);
    }
    if (found == 0) {
        Statement begin(database.handle(),
                        "INSERT INTO sqlite_sequence (name, seq) VALUES ('entries', :last)");
        begin.set(":last", static_cast<std::int64_t>(last)).run();
    }
    database.execute(("PRAGMA application_id = " + std::to_string(kOurs)).c_str());
    database.execute(("PRAGMA user_version = " + std::to_string(kVersion)).c_str());
    transaction.commit();
}

}  // namespace cvagent
