#include "base/sqlite_file.h"

#include <sqlite3.h>

#include <chrono>
#include <cstring>
#include <thread>
#include <utility>

#include "base/errors.h"
#include "base/stop_signals.h"

namespace kelo::tool {
namespace {

constexpr int kBusyTimeoutMs = 10'000;
constexpr int kInstructionsPerCheck = 10000;

int MustStop(void *) {
    return StopSignals::Received() != 0 ? 1 : 0;
}

// Asks for a lock every millisecond: with growing pauses, as SQLite makes them by itself, it would hardly
// ever meet the short moment between two transactions of a busy writer.
int WaitForLock(void *timeoutMs, int calls) {
    if (StopSignals::Received() != 0 || calls >= *static_cast<int *>(timeoutMs))
        return 0;
    std::this_thread::sleep_for(std::chrono::milliseconds(1));
    return 1;
}

void Bind(sqlite3_stmt *statement, const std::string &value) {
    sqlite3_bind_text64(statement, 1, value.data(), value.size(), SQLITE_STATIC, SQLITE_UTF8);
}

} // namespace

void FinalizeStatement::operator()(sqlite3_stmt *statement) const {
    sqlite3_finalize(statement);
}

void SqliteFile::Close::operator()(sqlite3 *db) const {
    sqlite3_close(db);
}

SqliteFile::SqliteFile(std::string path, Mode mode)
    : path_(std::move(path)), busyTimeoutMs_(std::make_unique<int>(kBusyTimeoutMs)) {
    sqlite3 *db = nullptr;
    const int flags = mode == Mode::kRead ? SQLITE_OPEN_READONLY : SQLITE_OPEN_READWRITE;
    const int status = sqlite3_open_v2(path_.c_str(), &db, flags, nullptr);
    db_.reset(db);
    if (status != SQLITE_OK)
        Fail(status);
    SetBusyTimeout(kBusyTimeoutMs);
    sqlite3_progress_handler(db, kInstructionsPerCheck, MustStop, nullptr);
    // What the file's schema holds must do nothing but store.
    sqlite3_db_config(db, SQLITE_DBCONFIG_TRUSTED_SCHEMA, 0, nullptr);
    sqlite3_db_config(db, SQLITE_DBCONFIG_ENABLE_TRIGGER, 0, nullptr);
    Run("PRAGMA cell_size_check=ON");
}

void SqliteFile::Fail(int status) {
    if (status == SQLITE_INTERRUPT || status == SQLITE_BUSY)
        StopSignals::Check();
    std::string cause = db_ != nullptr ? sqlite3_errmsg(db_.get()) : sqlite3_errstr(status);
    const int systemError = db_ != nullptr ? sqlite3_system_errno(db_.get()) : 0;
    if (systemError != 0)
        cause += std::string(" (") + std::strerror(systemError) + ")";
    throw DatabaseError(path_ + ": " + cause);
}

void SqliteFile::Run(const std::string &sql) {
    const int status = sqlite3_exec(db_.get(), sql.c_str(), nullptr, nullptr, nullptr);
    if (status != SQLITE_OK)
        Fail(status);
}

void SqliteFile::Run(const std::string &sql, const std::string &value) {
    const SqliteStatement statement = Prepare(sql);
    Bind(statement.get(), value);
    while (Step(statement.get())) {
    }
}

void SqliteFile::SetBusyTimeout(int timeoutMs) {
    *busyTimeoutMs_ = timeoutMs;
    sqlite3_busy_handler(db_.get(), WaitForLock, busyTimeoutMs_.get());
}

SqliteStatement SqliteFile::Prepare(const std::string &sql) {
    sqlite3_stmt *statement = nullptr;
    const int status = sqlite3_prepare_v2(db_.get(), sql.c_str(), -1, &statement, nullptr);
    if (status != SQLITE_OK)
        Fail(status);
    return SqliteStatement(statement);
}

bool SqliteFile::Step(sqlite3_stmt *statement) {
    const int status = sqlite3_step(statement);
    if (status != SQLITE_ROW && status != SQLITE_DONE)
        Fail(status);
    return status == SQLITE_ROW;
}

int64_t SqliteFile::Number(const std::string &sql) {
    const SqliteStatement statement = Prepare(sql);
    return Step(statement.get()) ? sqlite3_column_int64(statement.get(), 0) : 0;
}

int64_t SqliteFile::Number(const std::string &sql, const std::string &value) {
    const SqliteStatement statement = Prepare(sql);
    Bind(statement.get(), value);
    return Step(statement.get()) ? sqlite3_column_int64(statement.get(), 0) : 0;
}

std::string SqliteFile::Text(const std::string &sql) {
    const SqliteStatement statement = Prepare(sql);
    if (!Step(statement.get()))
        return "";
    const auto *text = reinterpret_cast<const char *>(sqlite3_column_text(statement.get(), 0));
    return text != nullptr ? text : "";
}

bool SqliteFile::IsInWalMode() {
    return Text("PRAGMA journal_mode") == "wal";
}

} // namespace kelo::tool
