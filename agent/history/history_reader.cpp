#include <sys/stat.h>

#include "agent/history/history.h"
#include "agent/history/schema.h"

namespace cvagent {

namespace {

/// Without the right to make the files that go with a file that is written, it is read as it stands where
/// there is nothing in them: nobody writes it then.
bool isAtRest(const std::string& file) {
    struct stat found {};
    return stat((file + "-wal").c_str(), &found) != 0 || found.st_size == 0;
}

std::unique_ptr<Database> opened(const std::string& file) {
    try {
        auto database = std::make_unique<Database>(file, Database::Access::read);
        database->number("PRAGMA user_version");
        return database;
    } catch (const HistoryError& error) {
        if (error.kind() == HistoryError::damaged || !isAtRest(file)) {
            throw;
        }
    }
    return std::make_unique<Database>(file, Database::Access::frozen);
}

}  // namespace

HistoryReader::HistoryReader(const HistoryPlace& place) {
    database_ = opened(judgeForReading(place).file());
    if (!hasSchema(*database_)) {
        throw HistoryError(HistoryError::absent, "there is none");
    }
    entries_ = std::make_unique<Entries>(*database_);
}

HistoryReader::~HistoryReader() = default;

std::vector<HistoryEntry> HistoryReader::read(const HistoryQuery& query, std::size_t most) {
    return entries_->read(query, most);
}

Entries::Tail HistoryReader::lastOf(const HistoryQuery& query, std::size_t most) {
    return entries_->lastOf(query, most);
}

}  // namespace cvagent
