#include "store/log_store.h"

#include <sqlite3.h>
#include <unistd.h>

#include <cerrno>
#include <cstring>
#include <filesystem>

#include "base/atomic_file.h"
#include "store/logs_schema.h"

namespace kelo::tool {
namespace {

// Columns as in logs.sql; both severity columns get the word.
constexpr char kInsertLog[] =
    "INSERT INTO logs(host,ip,fac,prio,llevel,tag,utcsec,tzoffset,ldate,ltime,prog,msg) "
    "VALUES(?1,?2,?3,?4,?4,?5,?6,?7,?8,?9,?10,?11)";

constexpr char kCreateProgress[] = "CREATE TABLE IF NOT EXISTS parse_progress("
                                   "source TEXT PRIMARY KEY, head BLOB, offset INTEGER, lines INTEGER)";
constexpr char kLoadProgress[] = "SELECT head,offset,lines FROM parse_progress WHERE source=?1";
constexpr char kSaveProgress[] =
    "INSERT OR REPLACE INTO parse_progress(source,head,offset,lines) VALUES(?1,?2,?3,?4)";

// The bound text must outlive the step.
void BindText(sqlite3_stmt *statement, int index, std::string_view text) {
    sqlite3_bind_text64(statement, index, text.data(), text.size(), SQLITE_STATIC, SQLITE_UTF8);
}

void BindNumber(sqlite3_stmt *statement, int index, uint64_t number) {
    sqlite3_bind_int64(statement, index, static_cast<sqlite3_int64>(number));
}

// Removes the forerunner of a database that does not get its name.
class ForerunnerRemover {
public:
    explicit ForerunnerRemover(std::string file) : file_(std::move(file)) {}
    ~ForerunnerRemover() {
        for (const char *suffix : {"", "-journal", "-wal", "-shm"})
            unlink((file_ + suffix).c_str());
    }
    ForerunnerRemover(const ForerunnerRemover &) = delete;
    ForerunnerRemover &operator=(const ForerunnerRemover &) = delete;

private:
    std::string file_;
};

} // namespace

void LogStore::CloseDatabase::operator()(sqlite3 *db) const {
    sqlite3_close(db);
}
void LogStore::FinalizeStatement::operator()(sqlite3_stmt *statement) const {
    sqlite3_finalize(statement);
}

// An absolute path is never taken for a URI or for ":memory:".
LogStore::LogStore(const std::string &path, const LogStoreOptions &options)
    : options_(options), path_(std::filesystem::absolute(path)) {
    if (access(path_.c_str(), F_OK) != 0 && errno == ENOENT)
        Create();
    file_ = path_;
    Open(SQLITE_OPEN_READWRITE);
    FillEmpty();
    if (!options_.mustSyncCommits)
        Run("PRAGMA synchronous=NORMAL");
    insertLog_ = Prepare(kInsertLog);
}

LogStore::~LogStore() {
    // SQLite leaves the write-ahead log of a moved file behind, where a fresh database would be taken for its
    // owner.
    if (db_ != nullptr && HasMoved())
        sqlite3_wal_checkpoint_v2(db_.get(), nullptr, SQLITE_CHECKPOINT_TRUNCATE, nullptr, nullptr);
}

void LogStore::Create() {
    file_ = path_ + ".new-" + std::to_string(getpid());
    const ForerunnerRemover remover(file_);
    unlink(file_.c_str()); // left by a killed process that had our number
    Open(SQLITE_OPEN_READWRITE | SQLITE_OPEN_CREATE);
    Run("PRAGMA journal_mode=WAL");
    Run(kLogsSchema);
    db_.reset();
    // Whoever was faster keeps the name: both files are alike.
    if (!RenameToFreeName(file_, path_) && errno != EEXIST)
        throw StoreError(path_ + ": " + std::strerror(errno), SQLITE_CANTOPEN, errno);
    SyncFolderOf(path_);
}

template <typename Work>
void LogStore::InTransaction(Work work) {
    errno = 0; // what an earlier operation left there is no reason for a failure of ours
    Run("BEGIN IMMEDIATE");
    try {
        work();
        Run("COMMIT");
    } catch (const DatabaseError &) {
        sqlite3_reset(insertLog_.get());
        sqlite3_reset(saveProgress_.get());
        sqlite3_exec(db_.get(), "ROLLBACK", nullptr, nullptr, nullptr);
        throw;
    }
}

// A file that somebody has opened before anybody stored something in it has no table yet.
void LogStore::FillEmpty() {
    const auto isEmpty = [this] {
        const Statement anything = Prepare("SELECT 1 FROM sqlite_schema");
        const int status = sqlite3_step(anything.get());
        if (status != SQLITE_ROW && status != SQLITE_DONE)
            Fail();
        return status == SQLITE_DONE;
    };
    if (!isEmpty())
        return;
    Run("PRAGMA journal_mode=WAL");
    InTransaction([&] {
        if (isEmpty())
            Run(kLogsSchema);
    });
}

void LogStore::Open(int flags) {
    sqlite3 *db = nullptr;
    const int status = sqlite3_open_v2(file_.c_str(), &db, flags | SQLITE_OPEN_NOMUTEX, nullptr);
    db_.reset(db);
    if (status != SQLITE_OK)
        Fail();
    sqlite3_busy_timeout(db, options_.busyTimeoutMs);
}

void LogStore::Fail() {
    const int lastError = errno;
    std::string cause = db_ != nullptr ? sqlite3_errmsg(db_.get()) : "out of memory";
    const int code = db_ != nullptr ? sqlite3_errcode(db_.get()) & 0xff : SQLITE_NOMEM;
    // SQLite forgets the reason of a write that fails within a statement.
    int systemError = db_ != nullptr ? sqlite3_system_errno(db_.get()) : 0;
    if (systemError == 0 && code == SQLITE_IOERR)
        systemError = lastError;
    if (systemError != 0)
        cause += std::string(" (") + std::strerror(systemError) + ")";
    throw StoreError(path_ + ": " + cause, code, systemError);
}

void LogStore::Run(const char *sql) {
    if (sqlite3_exec(db_.get(), sql, nullptr, nullptr, nullptr) != SQLITE_OK)
        Fail();
}

LogStore::Statement LogStore::Prepare(const char *sql) {
    sqlite3_stmt *statement = nullptr;
    if (sqlite3_prepare_v3(db_.get(), sql, -1, SQLITE_PREPARE_PERSISTENT, &statement, nullptr) != SQLITE_OK)
        Fail();
    return Statement(statement);
}

void LogStore::StepToEnd(sqlite3_stmt *statement) {
    const int status = sqlite3_step(statement);
    if (status != SQLITE_DONE)
        Fail();
    sqlite3_reset(statement);
}

std::optional<StoreProgress> LogStore::ProgressGet(const std::string &source) {
    PrepareProgress();
    const Statement statement = Prepare(kLoadProgress);
    BindText(statement.get(), 1, source);
    const int status = sqlite3_step(statement.get());
    if (status == SQLITE_DONE)
        return std::nullopt;
    if (status != SQLITE_ROW)
        Fail();
    StoreProgress progress;
    progress.source = source;
    if (const void *head = sqlite3_column_blob(statement.get(), 0))
        progress.head.assign(static_cast<const char *>(head),
                             static_cast<size_t>(sqlite3_column_bytes(statement.get(), 0)));
    progress.offset = static_cast<uint64_t>(sqlite3_column_int64(statement.get(), 1));
    progress.lines = static_cast<uint64_t>(sqlite3_column_int64(statement.get(), 2));
    return progress;
}

void LogStore::Store(std::span<const _SYSLOG_LOG_DATA_tag> logs) {
    InTransaction([&] {
        for (const _SYSLOG_LOG_DATA_tag &log : logs)
            InsertLog(log);
    });
}

void LogStore::Store(std::span<const _SYSLOG_LOG_DATA_tag> logs, const StoreProgress &progress) {
    PrepareProgress();
    InTransaction([&] {
        for (const _SYSLOG_LOG_DATA_tag &log : logs)
            InsertLog(log);
        SaveProgress(progress);
    });
}

bool LogStore::HasMoved() {
    int hasMoved = 0;
    return sqlite3_file_control(db_.get(), "main", SQLITE_FCNTL_HAS_MOVED, &hasMoved) == SQLITE_OK &&
           hasMoved != 0;
}

void LogStore::PrepareProgress() {
    if (saveProgress_ != nullptr)
        return;
    Run(kCreateProgress);
    saveProgress_ = Prepare(kSaveProgress);
}

void LogStore::InsertLog(const _SYSLOG_LOG_DATA_tag &log) {
    sqlite3_stmt *insert = insertLog_.get();
    BindText(insert, 1, log.host);
    BindText(insert, 2, log.ip);
    BindText(insert, 3, log.fac);
    BindText(insert, 4, g_MappingSyslogPrior[log.prio]);
    BindText(insert, 5, log.tag);
    sqlite3_bind_int64(insert, 6, log.utcsec);
    BindText(insert, 7, log.tzoffset);
    BindText(insert, 8, log.ldate);
    BindText(insert, 9, log.ltime);
    BindText(insert, 10, log.prog);
    BindText(insert, 11, log.msg);
    StepToEnd(insert);
}

void LogStore::SaveProgress(const StoreProgress &progress) {
    sqlite3_stmt *save = saveProgress_.get();
    BindText(save, 1, progress.source);
    sqlite3_bind_blob64(save, 2, progress.head.data(), progress.head.size(), SQLITE_STATIC);
    BindNumber(save, 3, progress.offset);
    BindNumber(save, 4, progress.lines);
    StepToEnd(save);
}

} // namespace kelo::tool
