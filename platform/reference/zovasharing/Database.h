#pragma once

#include <cstdint>
#include <string>
#include <string_view>

#include "modules/SqliteModule.h"

namespace reference::sharing {

/**
 * The database of sharing links, open for the length of one operation: no handle lives on, so that none can be carried
 * across a fork. Needs effective root.
 */
class Database {
public:
    enum class State {
        kGood,
        /** No link was ever made. */
        kMissing,
        kFailed,
    };

    /** Opens what is there. Logs what cannot be used. */
    Database();
    /** Opens it, and makes it first where it is missing. */
    static Database Made();
    Database(Database&& other) noexcept;
    Database(const Database&) = delete;
    Database& operator=(const Database&) = delete;
    ~Database();

    State GetState() const { return state; }
    bool IsGood() const { return state == State::kGood; }

    /** Statements that are the library's own and give no rows. */
    bool Run(const char* statements);
    int Changes() const;
    int64_t LastId() const;

private:
    friend class Statement;

    explicit Database(bool make);
    bool Open();

    const ZovaSqliteFunctions* functions = nullptr;
    ZovaSqlite* handle = nullptr;
    State state = State::kFailed;
};

/** One prepared statement. A failure on the way shows in `Step`. */
class Statement {
public:
    Statement(Database& database, const char* text);
    Statement(const Statement&) = delete;
    Statement& operator=(const Statement&) = delete;
    ~Statement();

    /** Binds the next parameter. */
    Statement& Bind(std::string_view text);
    Statement& Bind(int64_t number);

    /** A ZovaSqliteStep. */
    int Step();
    /** Steps once: whether the statement ended without a row. */
    bool Finish() { return Step() == ZOVA_SQLITE_DONE; }

    /** The next column of the row, in order. */
    std::string Text();
    int64_t Number();

private:
    const ZovaSqliteFunctions* functions;
    ZovaSqliteStatement* handle;
    bool good;
    int parameter = 0;
    int column = 0;
};

/** Rolls back at the end of its scope what was not committed. Waits for other writers at its beginning. */
class Transaction {
public:
    explicit Transaction(Database& database);
    Transaction(const Transaction&) = delete;
    Transaction& operator=(const Transaction&) = delete;
    ~Transaction();

    bool IsOpen() const { return open; }
    bool Commit();

private:
    Database& database;
    bool open;
};

}  // namespace reference::sharing
