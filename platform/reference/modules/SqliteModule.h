#pragma once

// What the module zova-sqlite.so exports. It stands apart so that SQLite is mapped only where sharing links are used.

#include <cstddef>

struct ZovaSqlite;
struct ZovaSqliteStatement;

enum ZovaSqliteStep {
    ZOVA_SQLITE_ROW = 1,
    ZOVA_SQLITE_DONE = 0,
    ZOVA_SQLITE_CONSTRAINT = -1,
    ZOVA_SQLITE_FAILED = -2,
};

/** A handle is good in the process that opened it alone: it must be closed before a fork. */
struct ZovaSqliteFunctions {
    /** Opens an existing database for reading and writing, never through a link; null on failure. */
    ZovaSqlite* (*open)(const char* path, int busyMilliseconds);
    void (*close)(ZovaSqlite* database);
    /** Runs statements that give no rows. 0 on success. */
    int (*run)(ZovaSqlite* database, const char* statements);
    /** Rows that the last statement changed. */
    int (*changes)(ZovaSqlite* database);
    /** Row id of the last insertion. */
    long long (*lastId)(ZovaSqlite* database);
    /** Null on failure. */
    ZovaSqliteStatement* (*prepare)(ZovaSqlite* database, const char* statement);
    void (*finish)(ZovaSqliteStatement* statement);
    /** Parameters count from 1; the text is copied. 0 on success. */
    int (*bindText)(ZovaSqliteStatement* statement, int at, const char* data, size_t size);
    int (*bindNumber)(ZovaSqliteStatement* statement, int at, long long value);
    /** A ZovaSqliteStep. */
    int (*step)(ZovaSqliteStatement* statement);
    /** Columns count from 0. The text is good until the next step. */
    const char* (*text)(ZovaSqliteStatement* statement, int column, size_t* size);
    long long (*number)(ZovaSqliteStatement* statement, int column);
};

extern "C" {

const ZovaSqliteFunctions* ZovaSqliteGetFunctions();

}  // extern "C"
