#include "zovasharing/Database.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <syslog.h>

#include <cerrno>
#include <utility>

#include "Paths.h"
#include "common/Files.h"
#include "common/LazyModule.h"
#include "common/UniqueFd.h"

namespace reference::sharing {

namespace {

constexpr int kBusyMilliseconds = 5000;
constexpr int64_t kSchemaVersion = 1;

constexpr const char* kSchema = R"(
BEGIN IMMEDIATE;
CREATE TABLE entries (
    id INTEGER PRIMARY KEY AUTOINCREMENT,
    hash TEXT NOT NULL UNIQUE,
    owner_uid INTEGER NOT NULL,
    owner_name TEXT NOT NULL,
    project TEXT NOT NULL,
    paths TEXT NOT NULL,
    protect_type INTEGER NOT NULL,
    password TEXT NOT NULL,
    users TEXT NOT NULL,
    addresses TEXT NOT NULL,
    match_ip INTEGER NOT NULL,
    created INTEGER NOT NULL,
    expires INTEGER NOT NULL,
    visits INTEGER NOT NULL,
    visit_limit INTEGER NOT NULL,
    enabled INTEGER NOT NULL) STRICT;
CREATE INDEX entries_by_owner ON entries (owner_uid);
CREATE TABLE sessions (
    id INTEGER PRIMARY KEY AUTOINCREMENT,
    sid_digest TEXT NOT NULL UNIQUE,
    uid INTEGER NOT NULL,
    user_name TEXT NOT NULL,
    address TEXT NOT NULL,
    created INTEGER NOT NULL,
    expires INTEGER NOT NULL) STRICT;
CREATE INDEX sessions_by_end ON sessions (expires);
CREATE TABLE tokens (
    id INTEGER PRIMARY KEY AUTOINCREMENT,
    session_id INTEGER NOT NULL REFERENCES sessions ON DELETE CASCADE,
    entry_id INTEGER NOT NULL REFERENCES entries ON DELETE CASCADE,
    UNIQUE (session_id, entry_id)) STRICT;
CREATE INDEX tokens_by_entry ON tokens (entry_id);
PRAGMA user_version = 1;
COMMIT;
)";

LazyModule module(paths::kSqliteModule);

/** Makes an empty file of root's own, unless there is one. */
bool MakeFile() {
    if (!EnsurePrivateDirectory(paths::kSharingDirectory)) {
        return false;
    }
    constexpr int kFlags = O_RDWR | O_CREAT | O_EXCL | O_NOFOLLOW | O_CLOEXEC;
    const UniqueFd made(open(paths::kSharingDatabase, kFlags, 0600));
    return made.IsOpen() || errno == EEXIST;
}

Database::State FindFile() {
    struct stat folder;
    struct stat file;
    if (lstat(paths::kSharingDirectory, &folder) != 0 || lstat(paths::kSharingDatabase, &file) != 0) {
        return errno == ENOENT ? Database::State::kMissing : Database::State::kFailed;
    }
    const auto isPrivate = [](const struct stat& status) { return status.st_uid == 0 && (status.st_mode & 077) == 0; };
    return S_ISDIR(folder.st_mode) && S_ISREG(file.st_mode) && isPrivate(folder) && isPrivate(file)
               ? Database::State::kGood
               : Database::State::kFailed;
}

}  // namespace

Database::Database() : Database(false) {}

Database Database::Made() {
    return Database(true);
}

Database::Database(bool make) {
    if (make && !MakeFile()) {
        syslog(LOG_ERR, "folder %s cannot be used", paths::kSharingDirectory);
        return;
    }
    state = FindFile();
    if (state == State::kGood && !Open()) {
        state = State::kFailed;
    }
    if (state == State::kFailed) {
        syslog(LOG_ERR, "database %s cannot be used", paths::kSharingDatabase);
    }
}

Database::Database(Database&& other) noexcept
    : functions(other.functions),
      handle(std::exchange(other.handle, nullptr)),
      state(std::exchange(other.state, State::kFailed)) {}

Database::~Database() {
    if (handle != nullptr) {
        functions->close(handle);
    }
}

bool Database::Open() {
    auto* find = module.Find<decltype(ZovaSqliteGetFunctions)>("ZovaSqliteGetFunctions");
    functions = find != nullptr ? find() : nullptr;
    handle = functions != nullptr ? functions->open(paths::kSharingDatabase, kBusyMilliseconds) : nullptr;
    if (handle == nullptr || !Run("PRAGMA temp_store = MEMORY; PRAGMA secure_delete = ON")) {
        return false;
    }
    const auto version = [this] {
        Statement statement(*this, "PRAGMA user_version");
        return statement.Step() == ZOVA_SQLITE_ROW ? statement.Number() : -1;
    };
    // Of several that find it empty, one makes the tables; the others fail to and find them made.
    const int64_t found = version();
    return found == kSchemaVersion || (found == 0 && (Run(kSchema) || (Run("ROLLBACK"), version() == kSchemaVersion)));
}

bool Database::Run(const char* statements) {
    return functions->run(handle, statements) == 0;
}

int Database::Changes() const {
    return functions->changes(handle);
}

int64_t Database::LastId() const {
    return functions->lastId(handle);
}

// ---- statements ----

Statement::Statement(Database& database, const char* text)
    : functions(database.functions),
      handle(database.handle != nullptr ? functions->prepare(database.handle, text) : nullptr),
      good(handle != nullptr) {}

Statement::~Statement() {
    if (handle != nullptr) {
        functions->finish(handle);
    }
}

Statement& Statement::Bind(std::string_view text) {
    good =
        good && functions->bindText(handle, ++parameter, text.data() != nullptr ? text.data() : "", text.size()) == 0;
    return *this;
}

Statement& Statement::Bind(int64_t number) {
    good = good && functions->bindNumber(handle, ++parameter, number) == 0;
    return *this;
}

int Statement::Step() {
    column = 0;
    return good ? functions->step(handle) : ZOVA_SQLITE_FAILED;
}

std::string Statement::Text() {
    size_t size = 0;
    const char* text = functions->text(handle, column++, &size);
    return text == nullptr ? std::string() : std::string(text, size);
}

int64_t Statement::Number() {
    return functions->number(handle, column++);
}

// ---- transactions ----

Transaction::Transaction(Database& base) : database(base), open(base.IsGood() && base.Run("BEGIN IMMEDIATE")) {}

Transaction::~Transaction() {
    if (open) {
        database.Run("ROLLBACK");
    }
}

bool Transaction::Commit() {
    open = open && !database.Run("COMMIT");
    return !open;
}

}  // namespace reference::sharing
