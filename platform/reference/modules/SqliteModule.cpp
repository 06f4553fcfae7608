#pragma GCC visibility push(default)
#include "modules/SqliteModule.h"
#pragma GCC visibility pop

#include <sqlite3.h>

#include <climits>

namespace {

/** Longest text or row, in bytes. */
constexpr int kLongestRow = 1 << 20;

sqlite3* Of(ZovaSqlite* database) {
    return reinterpret_cast<sqlite3*>(database);
}

sqlite3_stmt* Of(ZovaSqliteStatement* statement) {
    return reinterpret_cast<sqlite3_stmt*>(statement);
}

ZovaSqlite* Open(const char* path, int busyMilliseconds) {
    sqlite3* database = nullptr;
    constexpr int kFlags = SQLITE_OPEN_READWRITE | SQLITE_OPEN_NOFOLLOW | SQLITE_OPEN_PRIVATECACHE;
    const bool good = sqlite3_open_v2(path, &database, kFlags, nullptr) == SQLITE_OK &&
                      sqlite3_busy_timeout(database, busyMilliseconds) == SQLITE_OK &&
                      sqlite3_db_config(database, SQLITE_DBCONFIG_DEFENSIVE, 1, nullptr) == SQLITE_OK &&
                      sqlite3_db_config(database, SQLITE_DBCONFIG_TRUSTED_SCHEMA, 0, nullptr) == SQLITE_OK &&
                      sqlite3_db_config(database, SQLITE_DBCONFIG_ENABLE_FKEY, 1, nullptr) == SQLITE_OK;
    if (!good) {
        sqlite3_close(database);
        return nullptr;
    }
    sqlite3_limit(database, SQLITE_LIMIT_LENGTH, kLongestRow);
    sqlite3_limit(database, SQLITE_LIMIT_ATTACHED, 0);
    return reinterpret_cast<ZovaSqlite*>(database);
}

void Close(ZovaSqlite* database) {
    sqlite3_close(Of(database));
}

int Run(ZovaSqlite* database, const char* statements) {
    return sqlite3_exec(Of(database), statements, nullptr, nullptr, nullptr) == SQLITE_OK ? 0 : -1;
}

int Changes(ZovaSqlite* database) {
    return sqlite3_changes(Of(database));
}

long long LastId(ZovaSqlite* database) {
    return sqlite3_last_insert_rowid(Of(database));
}

ZovaSqliteStatement* Prepare(ZovaSqlite* database, const char* statement) {
    sqlite3_stmt* made = nullptr;
    return sqlite3_prepare_v2(Of(database), statement, -1, &made, nullptr) == SQLITE_OK
               ? reinterpret_cast<ZovaSqliteStatement*>(made)
               : nullptr;
}

void Finish(ZovaSqliteStatement* statement) {
    sqlite3_finalize(Of(statement));
}

int BindText(ZovaSqliteStatement* statement, int at, const char* data, size_t size) {
    return size <= INT_MAX &&
                   sqlite3_bind_text(Of(statement), at, data, static_cast<int>(size), SQLITE_TRANSIENT) == SQLITE_OK
               ? 0
               : -1;
}

int BindNumber(ZovaSqliteStatement* statement, int at, long long value) {
    return sqlite3_bind_int64(Of(statement), at, value) == SQLITE_OK ? 0 : -1;
}

int Step(ZovaSqliteStatement* statement) {
    switch (sqlite3_step(Of(statement))) {
        case SQLITE_ROW:
            return ZOVA_SQLITE_ROW;
        case SQLITE_DONE:
            return ZOVA_SQLITE_DONE;
        case SQLITE_CONSTRAINT:
            return ZOVA_SQLITE_CONSTRAINT;
        default:
            return ZOVA_SQLITE_FAILED;
    }
}

const char* Text(ZovaSqliteStatement* statement, int column, size_t* size) {
    const auto* text = reinterpret_cast<const char*>(sqlite3_column_text(Of(statement), column));
    *size = text == nullptr ? 0 : static_cast<size_t>(sqlite3_column_bytes(Of(statement), column));
    return text;
}

long long Number(ZovaSqliteStatement* statement, int column) {
    return sqlite3_column_int64(Of(statement), column);
}

constexpr ZovaSqliteFunctions kFunctions = {Open,   Close,    Run,        Changes, LastId, Prepare,
                                            Finish, BindText, BindNumber, Step,    Text,   Number};

}  // namespace

const ZovaSqliteFunctions* ZovaSqliteGetFunctions() {
    return &kFunctions;
}
