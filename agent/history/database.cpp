#include "agent/history/database.h"

#include <cerrno>
#include <cstring>
#include <limits>

#include "agent/history/history_error.h"
#include "agent/history/sqlite_library.h"

namespace cvagent {

namespace {

constexpr int kPatience = 2000;  // milliseconds for another writer's transaction

HistoryError::Kind kindOf(int code, int systemError) {
    if (systemError == ENOSPC || systemError == EDQUOT || systemError == EFBIG) {
        return HistoryError::full;
    }
    switch (code & 0xFF) {
        case SQLITE_FULL:
            return HistoryError::full;
        case SQLITE_BUSY:
        case SQLITE_LOCKED:
            return HistoryError::busy;
        case SQLITE_CORRUPT:
        case SQLITE_NOTADB:
            return HistoryError::damaged;
        case SQLITE_READONLY:
            return HistoryError::readOnly;
        case SQLITE_PERM:
        case SQLITE_AUTH:
            return HistoryError::denied;
        default:
            return systemError == EACCES || systemError == EPERM ? HistoryError::denied
                   : systemError == EROFS                        ? HistoryError::readOnly
                                                                 : HistoryError::failed;
    }
}

/// The system's own error counts only for what is done with files: it is that of the last such call.
[[noreturn]] void fail(sqlite3* database) {
    const int code = sqlite().errorCode(database);
    const int kind = code & 0xFF;
    const bool ofFiles = kind == SQLITE_IOERR || kind == SQLITE_CANTOPEN || kind == SQLITE_FULL;
    const int systemError = ofFiles ? sqlite().systemError(database) : 0;
    std::string text = sqlite().errorText(database);
    if (systemError != 0) {
        text += std::string(" (") + std::strerror(systemError) + ")";
    }
    throw HistoryError(kindOf(code, systemError), text);
}

std::string asUri(const std::string& file) {
    constexpr const char* kDigits = "0123456789ABCDEF";
    std::string uri = "file:";
    for (const char byte : file) {
        const auto value = static_cast<unsigned char>(byte);
        if (std::strchr("%?#", byte) != nullptr) {
            uri += {'%', kDigits[value / 16], kDigits[value % 16]};
        } else {
            uri += byte;
        }
    }
    return uri + "?immutable=1";
}

}  // namespace

void Statement::Finalize::operator()(sqlite3_stmt* statement) const {
    sqlite().finalize(statement);  // what it returns is the error of the last run, which was thrown
}

Statement::Statement(sqlite3* database, const char* sql) : database_(database) {
    sqlite3_stmt* made = nullptr;
    const int code = sqlite().prepare(database, sql, -1, SQLITE_PREPARE_PERSISTENT, &made, nullptr);
    statement_.reset(made);
    if ((code & 0xFF) == SQLITE_ERROR) {  // a statement of ours does not fit what ought to be in the file
        throw HistoryError(HistoryError::damaged, sqlite().errorText(database));
    }
    if (code != SQLITE_OK) {
        fail(database);
    }
}

int Statement::placeOf(const char* parameter) const {
    const int place = sqlite().placeOf(statement_.get(), parameter);
    if (place == 0) {
        throw std::logic_error(std::string("no such parameter: ") + parameter);
    }
    return place;
}

Statement& Statement::set(const char* parameter, std::int64_t value) {
    if (sqlite().setNumber(statement_.get(), placeOf(parameter), value) != SQLITE_OK) {
        fail(database_);
    }
    return *this;
}

Statement& Statement::set(const char* parameter, const std::string& value) {
    const int code = sqlite().setText(statement_.get(), placeOf(parameter), value.data(), value.size(),
                                      SQLITE_STATIC, SQLITE_UTF8);
    if (code != SQLITE_OK) {
        fail(database_);
    }
    return *this;
}

bool Statement::next() {
    const int code = sqlite().step(statement_.get());
    if (code == SQLITE_ROW) {
        return true;
    }
    if (code == SQLITE_DONE) {
        reset();
        return false;
    }
    try {
        fail(database_);
    } catch (const HistoryError&) {
        reset();
        throw;
    }
}

void Statement::run() {
    while (next()) {
    }
}

void Statement::reset() {
    sqlite().reset(statement_.get());
}

std::int64_t Statement::number(int column) const {
    return sqlite().number(statement_.get(), column);
}

std::string Statement::text(int column) const {
    const auto* bytes = static_cast<const char*>(sqlite().bytes(statement_.get(), column));
    const int size = sqlite().size(statement_.get(), column);
    return bytes == nullptr ? std::string() : std::string(bytes, static_cast<std::size_t>(size));
}

void Database::Close::operator()(sqlite3* database) const {
    sqlite().close(database);
}

Database::Database(const std::string& file, Access access) {
    sqlite3* made = nullptr;
    const bool frozen = access == Access::frozen;
    const int rights = access == Access::write ? SQLITE_OPEN_READWRITE : SQLITE_OPEN_READONLY;
    const int flags = rights | SQLITE_OPEN_NOFOLLOW | SQLITE_OPEN_EXRESCODE | (frozen ? SQLITE_OPEN_URI : 0);
    const int code = sqlite().open((frozen ? asUri(file) : file).c_str(), &made, flags, nullptr);
    handle_.reset(made);
    if (made == nullptr) {
        throw std::bad_alloc();
    }
    if (code != SQLITE_OK) {
        fail(made);
    }
    sqlite().setPatience(made, kPatience);
    sqlite().configure(made, SQLITE_DBCONFIG_DEFENSIVE, 1, nullptr);
    sqlite().configure(made, SQLITE_DBCONFIG_TRUSTED_SCHEMA, 0, nullptr);
    if (access != Access::write) {
        // Who only looks leaves the file as it is.
        sqlite().configure(made, SQLITE_DBCONFIG_NO_CKPT_ON_CLOSE, 1, nullptr);
    } else {
        // Readers without the right to make the files beside it find them.
        int keep = 1;
        sqlite().controlFile(made, "main", SQLITE_FCNTL_PERSIST_WAL, &keep);
    }
}

void Database::execute(const char* sql) const {
    if (sqlite().execute(handle_.get(), sql, nullptr, nullptr, nullptr) != SQLITE_OK) {
        fail(handle_.get());
    }
}

std::int64_t Database::number(const char* sql) const {
    Statement statement(handle_.get(), sql);
    const std::int64_t value = statement.next() ? statement.number(0) : 0;
    statement.reset();
    return value;
}

Transaction::Transaction(const Database& database) : database_(database) {
    database_.execute("BEGIN IMMEDIATE");
}

Transaction::~Transaction() {
    if (open_ && sqlite().isOutsideTransaction(database_.handle()) == 0) {
        sqlite().execute(database_.handle(), "ROLLBACK", nullptr, nullptr, nullptr);
    }
}

void Transaction::commit() {
    database_.execute("COMMIT");
    open_ = false;
}

}  // namespace cvagent
