#include "base/sqlite.h"

#include <sqlite3.h>
#include <unistd.h>

#include <cerrno>
#include <chrono>
#include <cstring>
#include <thread>
#include <utility>

#include "base/stop_signals.h"
#include "keloplatform/cluster.h"
#include "keloplatform/vfs.h"

namespace kelo::tool {
namespace {

constexpr int kInstructionsPerCheck = 10000;

int FlagsOf(SqliteMode mode) {
    switch (mode) {
    case SqliteMode::kRead:
        return SQLITE_OPEN_READONLY;
    case SqliteMode::kWrite:
        return SQLITE_OPEN_READWRITE;
    default:
        return SQLITE_OPEN_READWRITE | SQLITE_OPEN_CREATE;
    }
}

int MustStop(void *) {
    return StopSignals::Received() != 0 ? 1 : 0;
}

} // namespace

void SqliteConnection::Close::operator()(sqlite3 *db) const {
    if (!isBorrowed)
        sqlite3_close(db);
}

SqliteConnection::SqliteConnection(const std::string &path, const SqliteOptions &options,
                                   const std::string &name)
    : name_(name.empty() ? path : name), options_(options) {
    do {
        Open(path);
    } while (!OpenLog());
    SetBusyTimeout(options.busyTimeoutMs);
    if (options.heedsStopSignals)
        sqlite3_progress_handler(db_.get(), kInstructionsPerCheck, MustStop, nullptr);
    if (options.trustsSchema)
        return;
    sqlite3_db_config(db_.get(), SQLITE_DBCONFIG_TRUSTED_SCHEMA, 0, nullptr);
    sqlite3_db_config(db_.get(), SQLITE_DBCONFIG_ENABLE_TRIGGER, 0, nullptr);
    Run("PRAGMA cell_size_check=ON");
}

void SqliteConnection::Open(const std::string &path) {
    sqlite3 *db = nullptr;
    const int status =
        sqlite3_open_v2(path.c_str(), &db, FlagsOf(options_.mode) | SQLITE_OPEN_NOMUTEX, KELODBVfs());
    db_.reset(db);
    if (status != SQLITE_OK)
        Fail(status);
}

// Opens the write-ahead log too and returns whether the file kept its name meanwhile. SQLite opens the log at
// the first read, by its name: of a file that was moved since, that is the log of the one that came after it.
bool SqliteConnection::OpenLog() {
    constexpr int kMostWaits = 5000;
    if (HasMoved())
        return false;
    // Whoever closes the database last has it for itself while it deletes the log.
    const char *const log = sqlite3_filename_wal(sqlite3_db_filename(db_.get(), "main"));
    for (int waits = 0;
         sqlite3_exec(db_.get(), "PRAGMA user_version", nullptr, nullptr, nullptr) == SQLITE_BUSY &&
         access(log, F_OK) == 0 && waits < kMostWaits;
         ++waits)
        std::this_thread::sleep_for(std::chrono::milliseconds(1));
    return !HasMoved();
}

void SqliteConnection::SetBusyTimeout(int timeoutMs) {
    options_.busyTimeoutMs = timeoutMs;
    if (options_.heedsStopSignals)
        sqlite3_busy_handler(db_.get(), WaitForLock, this);
    else
        sqlite3_busy_timeout(db_.get(), timeoutMs);
}

// Asks for a lock every millisecond: with the growing pauses of SQLite's own handler it would hardly ever hit
// the short moment between two transactions of a busy writer.
int SqliteConnection::WaitForLock(void *connection, int calls) {
    if (StopSignals::Received() != 0 ||
        calls >= static_cast<SqliteConnection *>(connection)->options_.busyTimeoutMs)
        return 0;
    std::this_thread::sleep_for(std::chrono::milliseconds(1));
    return 1;
}

void SqliteConnection::Fail(int status) const {
    const int lastError = errno;
    const int code = status & 0xff;
    if (options_.heedsStopSignals && (code == SQLITE_INTERRUPT || code == SQLITE_BUSY))
        StopSignals::Check();
    if (code == SQLITE_NOTADB && KELODBIsCluster(name_.c_str()) != 0)
        throw SqliteError(name_ + " describes a cluster: this needs a database of SQLite", code, 0);
    std::string cause = db_ != nullptr ? sqlite3_errmsg(db_.get()) : sqlite3_errstr(status);
    int systemError = db_ != nullptr ? sqlite3_system_errno(db_.get()) : 0;
    // SQLite forgets the reason of a write that fails within a statement, and errno still has it, unless
    // signals were asked for since.
    if (systemError == 0 && code == SQLITE_IOERR && !options_.heedsStopSignals)
        systemError = lastError;
    if (systemError != 0)
        cause += std::string(" (") + std::strerror(systemError) + ")";
    throw SqliteError(name_ + ": " + cause, code, systemError);
}

void SqliteConnection::Run(const std::string &sql) {
    errno = 0; // the value of an earlier operation is not the reason of this failure
    const int status = sqlite3_exec(db_.get(), sql.c_str(), nullptr, nullptr, nullptr);
    if (status != SQLITE_OK)
        Fail(status);
}

void SqliteConnection::Run(const std::string &sql, std::string_view value) {
    SqliteStatement statement(*this, sql);
    statement.Bind(1, value);
    statement.Run();
}

int64_t SqliteConnection::Number(const std::string &sql) {
    SqliteStatement statement(*this, sql);
    return statement.Step() ? statement.Number(0) : 0;
}

int64_t SqliteConnection::Number(const std::string &sql, std::string_view value) {
    SqliteStatement statement(*this, sql);
    statement.Bind(1, value);
    return statement.Step() ? statement.Number(0) : 0;
}

std::string SqliteConnection::Text(const std::string &sql) {
    SqliteStatement statement(*this, sql);
    return statement.Step() ? statement.Text(0) : "";
}

uint64_t SqliteConnection::Changes() const {
    return static_cast<uint64_t>(sqlite3_changes64(db_.get()));
}

void SqliteConnection::Checkpoint(bool mustEmpty) {
    sqlite3_wal_checkpoint_v2(db_.get(), "main",
                              mustEmpty ? SQLITE_CHECKPOINT_TRUNCATE : SQLITE_CHECKPOINT_PASSIVE, nullptr,
                              nullptr);
}

bool SqliteConnection::HasMoved() const {
    int hasMoved = 0;
    return sqlite3_file_control(db_.get(), "main", SQLITE_FCNTL_HAS_MOVED, &hasMoved) == SQLITE_OK &&
           hasMoved != 0;
}

void SqliteStatement::Finalize::operator()(sqlite3_stmt *statement) const {
    sqlite3_finalize(statement);
}

SqliteStatement::SqliteStatement(SqliteConnection &connection, const std::string &sql)
    : connection_(&connection) {
    errno = 0;
    sqlite3_stmt *statement = nullptr;
    const int status = sqlite3_prepare_v2(connection.Get(), sql.c_str(), -1, &statement, nullptr);
    if (status != SQLITE_OK)
        connection.Fail(status);
    statement_.reset(statement);
}

void SqliteStatement::Require(int status) const {
    if (status != SQLITE_OK)
        connection_->Fail(status);
}

void SqliteStatement::Bind(int index, std::string_view text) {
    Require(
        sqlite3_bind_text64(statement_.get(), index, text.data(), text.size(), SQLITE_STATIC, SQLITE_UTF8));
}

void SqliteStatement::Bind(int index, int64_t number) {
    Require(sqlite3_bind_int64(statement_.get(), index, number));
}

void SqliteStatement::BindBlob(int index, std::string_view bytes) {
    Require(sqlite3_bind_blob64(statement_.get(), index, bytes.data(), bytes.size(), SQLITE_STATIC));
}

void SqliteStatement::BindColumn(int index, const SqliteStatement &row, int column) {
    Require(sqlite3_bind_value(statement_.get(), index, sqlite3_column_value(row.statement_.get(), column)));
}

bool SqliteStatement::Step() {
    errno = 0;
    const int status = sqlite3_step(statement_.get());
    if (status != SQLITE_ROW && status != SQLITE_DONE)
        connection_->Fail(status);
    return status == SQLITE_ROW;
}

void SqliteStatement::Run() {
    const std::unique_ptr<sqlite3_stmt, int (*)(sqlite3_stmt *)> readied(statement_.get(), sqlite3_reset);
    while (Step()) {
    }
}

int64_t SqliteStatement::Number(int column) const {
    return sqlite3_column_int64(statement_.get(), column);
}

std::string SqliteStatement::Text(int column) const {
    const auto *text = reinterpret_cast<const char *>(sqlite3_column_text(statement_.get(), column));
    return text != nullptr ? text : "";
}

std::string SqliteStatement::Blob(int column) const {
    const auto *bytes = static_cast<const char *>(sqlite3_column_blob(statement_.get(), column));
    const auto size = static_cast<size_t>(sqlite3_column_bytes(statement_.get(), column));
    return bytes != nullptr ? std::string(bytes, size) : "";
}

SqliteTransaction::SqliteTransaction(SqliteConnection &connection) : connection_(connection) {
    connection.Run("BEGIN IMMEDIATE");
}

SqliteTransaction::~SqliteTransaction() {
    if (isOpen_) // SQLite may have rolled it back already
        sqlite3_exec(connection_.Get(), "ROLLBACK", nullptr, nullptr, nullptr);
}

void SqliteTransaction::Commit() {
    connection_.Run("COMMIT");
    isOpen_ = false;
}

void RemoveDatabase(const std::string &path) {
    for (const char *suffix : {"", "-journal", "-wal", "-shm", "-skip"})
        unlink((path + suffix).c_str());
}

} // namespace kelo::tool
