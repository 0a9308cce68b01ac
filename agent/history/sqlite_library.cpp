#include "agent/history/sqlite_library.h"

#include <dlfcn.h>

#include <string>

#include "agent/history/history_error.h"

namespace cvagent {

namespace {

constexpr const char* kSqliteFile = "libsqlite3.so.0";

[[noreturn]] void failToLoad() {
    const char* const reason = dlerror();
    throw HistoryError(HistoryError::failed,
                       std::string("SQLite cannot be loaded: ") + (reason != nullptr ? reason : kSqliteFile));
}

template <class Function>
void take(void* library, const char* name, Function& function) {
    void* const found = dlsym(library, name);
    if (found == nullptr) {
        failToLoad();
    }
    function = reinterpret_cast<Function>(found);
}

/// It stays loaded.
SqliteLibrary loaded() {
    void* const library = dlopen(kSqliteFile, RTLD_NOW | RTLD_LOCAL);
    if (library == nullptr) {
        failToLoad();
    }
    SqliteLibrary all{};
    take(library, "sqlite3_open_v2", all.open);
    take(library, "sqlite3_close_v2", all.close);
    take(library, "sqlite3_busy_timeout", all.setPatience);
    take(library, "sqlite3_db_config", all.configure);
    take(library, "sqlite3_file_control", all.controlFile);
    take(library, "sqlite3_exec", all.execute);
    take(library, "sqlite3_get_autocommit", all.isOutsideTransaction);
    take(library, "sqlite3_extended_errcode", all.errorCode);
    take(library, "sqlite3_system_errno", all.systemError);
    take(library, "sqlite3_errmsg", all.errorText);
    take(library, "sqlite3_prepare_v3", all.prepare);
    take(library, "sqlite3_finalize", all.finalize);
    take(library, "sqlite3_bind_parameter_index", all.placeOf);
    take(library, "sqlite3_bind_int64", all.setNumber);
    take(library, "sqlite3_bind_text64", all.setText);
    take(library, "sqlite3_step", all.step);
    take(library, "sqlite3_reset", all.reset);
    take(library, "sqlite3_column_int64", all.number);
    take(library, "sqlite3_column_blob", all.bytes);
    take(library, "sqlite3_column_bytes", all.size);
    return all;
}

}  // namespace

const SqliteLibrary& sqlite() {
    static const SqliteLibrary library = loaded();
    return library;
}

}  // namespace cvagent
