#pragma once

#include <cstdint>
#include <memory>
#include <string>

struct sqlite3;
struct sqlite3_stmt;

namespace cvagent {

/// One statement, prepared once and run as often as wanted. Its parameters have names (":path"), and all of
/// them are given before each run. Everything throws HistoryError.
class Statement {
public:
    /// @param database outlives it
    Statement(sqlite3* database, const char* sql);

    Statement& set(const char* parameter, std::int64_t value);
    /// Every byte is kept, zeros and what is no UTF-8 included. The text stays as it is until the run's end.
    Statement& set(const char* parameter, const std::string& value);
    /// Goes to the first or next row. @return false at the end; the statement can then be run again
    bool next();
    /// Runs what brings no rows.
    void run();
    /// Ends a run early.
    void reset();
    // Of the current row.
    std::int64_t number(int column) const;
    std::string text(int column) const;

private:
    struct Finalize {
        void operator()(sqlite3_stmt* statement) const;
    };

    int placeOf(const char* parameter) const;

    sqlite3* database_;
    std::unique_ptr<sqlite3_stmt, Finalize> statement_;
};

/// One open file. Everything throws HistoryError. One thread at a time.
class Database {
public:
    enum class Access {
        write,
        read,    ///< beside writers
        frozen,  ///< nobody writes, and nothing can be written beside the file
    };

    /// @param file whole path without symbolic links; it is there
    Database(const std::string& file, Access access);

    sqlite3* handle() const { return handle_.get(); }
    /// One statement or several that are run once and bring no rows.
    void execute(const char* sql) const;
    /// The first column of the first row; 0 when there is none.
    std::int64_t number(const char* sql) const;

private:
    struct Close {
        void operator()(sqlite3* database) const;
    };

    std::unique_ptr<sqlite3, Close> handle_;
};

/// All of it is kept or nothing. It begins as the one writer.
class Transaction {
public:
    explicit Transaction(const Database& database);
    Transaction(const Transaction&) = delete;
    Transaction& operator=(const Transaction&) = delete;
    /// Takes back what was not committed.
    ~Transaction();
    /// When it returns, all is on the disk.
    void commit();

private:
    const Database& database_;
    bool open_ = true;
};

}  // namespace cvagent
