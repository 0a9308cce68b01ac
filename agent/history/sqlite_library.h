#pragma once

#include <sqlite3.h>

namespace cvagent {

/// The functions of SQLite that are used here. It is loaded when a history is opened: who asks the service
/// does without, and loading it takes longer than the question.
struct SqliteLibrary {
    decltype(&sqlite3_open_v2) open;
    decltype(&sqlite3_close_v2) close;
    decltype(&sqlite3_busy_timeout) setPatience;
    decltype(&sqlite3_db_config) configure;
    decltype(&sqlite3_file_control) controlFile;
    decltype(&sqlite3_exec) execute;
    decltype(&sqlite3_get_autocommit) isOutsideTransaction;
    decltype(&sqlite3_extended_errcode) errorCode;
    decltype(&sqlite3_system_errno) systemError;
    decltype(&sqlite3_errmsg) errorText;
    decltype(&sqlite3_prepare_v3) prepare;
    decltype(&sqlite3_finalize) finalize;
    decltype(&sqlite3_bind_parameter_index) placeOf;
    decltype(&sqlite3_bind_int64) setNumber;
    decltype(&sqlite3_bind_text64) setText;
    decltype(&sqlite3_step) step;
    decltype(&sqlite3_reset) reset;
    decltype(&sqlite3_column_int64) number;
    decltype(&sqlite3_column_blob) bytes;
    decltype(&sqlite3_column_bytes) size;
};

/// Throws HistoryError where it cannot be loaded; the next call tries again.
const SqliteLibrary& sqlite();

}  // namespace cvagent
