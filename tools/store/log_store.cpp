#include "store/log_store.h"

#include <sqlite3.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <cstring>
#include <filesystem>
#include <iterator>

#include "base/atomic_file.h"
#include "base/files.h"
#include "kelosyslog/dbhandler.h"
#include "store/logs_schema.h"

namespace kelo::tool {
namespace {

// Columns as in logs.sql.
constexpr char kInsertLogs[] =
    "INSERT INTO logs(host,ip,fac,prio,llevel,tag,utcsec,tzoffset,ldate,ltime,prog,msg) "
    "SELECT host,ip,fac,prio,llevel,tag,utcsec,tzoffset,ldate,ltime,prog,msg FROM kelo_records";

constexpr char kCreateProgress[] = "CREATE TABLE IF NOT EXISTS parse_progress("
                                   "source TEXT PRIMARY KEY, head BLOB, offset INTEGER, lines INTEGER)";
constexpr char kLoadProgress[] = "SELECT head,offset,lines FROM parse_progress WHERE source=?1";
constexpr char kSaveProgress[] =
    "INSERT OR REPLACE INTO parse_progress(source,head,offset,lines) VALUES(?1,?2,?3,?4)";

// Removes the forerunner of a database that does not get its name.
class ForerunnerRemover {
public:
    explicit ForerunnerRemover(std::string file) : file_(std::move(file)) {}
    ~ForerunnerRemover() { RemoveDatabase(file_); }
    ForerunnerRemover(const ForerunnerRemover &) = delete;
    ForerunnerRemover &operator=(const ForerunnerRemover &) = delete;

private:
    std::string file_;
};

// Whether something lies under the names of the missing database: what a moved one has left, or the lock of
// whoever moves it now.
bool HasRemains(const std::string &path) {
    const char *const files[] = {"-wal", "-shm", "-journal", ".lock"};
    return std::any_of(std::begin(files), std::end(files), [&](const char *file) {
        struct stat status {};
        return lstat((path + file).c_str(), &status) == 0;
    });
}

// Creates the database as every handler of the library does: under the lock that excludes whoever moves one
// away, and with an empty file first, beside which SQLite deletes what a moved one has left. It would use the
// write-ahead log of that, and roll its journal back. Returns false where the library cannot: its tool needs
// a name that a shell can be given.
bool CreateLocked(const std::string &path) {
    namespace fs = std::filesystem;
    std::error_code unknown;
    const TemporaryFile schema((fs::temp_directory_path(unknown) / "kelosyslog-schema-XXXXXX").string(),
                               kLogsSchema);
    if (!schema.IsWritten() || !fs::is_directory(fs::path(path).parent_path(), unknown))
        return false; // the library would create the folder
    DBHandler database(path, schema.Path());
    const DBConnectionScope scope(database);
    return database.DBCon() == 0;
}

void Create(const std::string &path, int busyTimeoutMs) {
    if (HasRemains(path) && CreateLocked(path))
        return;
    const std::string file = path + ".new-" + std::to_string(getpid());
    const ForerunnerRemover remover(file);
    unlink(file.c_str()); // left by a killed process that had our number
    {
        SqliteConnection forerunner(file, {.mode = SqliteMode::kCreate, .busyTimeoutMs = busyTimeoutMs},
                                    path);
        forerunner.Run("PRAGMA journal_mode=WAL");
        forerunner.Run(kLogsTables);
    }
    // Whoever was faster keeps the name: both files are alike.
    if (!RenameToFreeName(file, path) && errno != EEXIST)
        throw SqliteError(path + ": " + std::strerror(errno), SQLITE_CANTOPEN, errno);
    SyncFolderOf(path);
}

// Returns the path of a database that is there now.
const std::string &CreateWhereMissing(const std::string &path, int busyTimeoutMs) {
    if (access(path.c_str(), F_OK) != 0 && errno == ENOENT)
        Create(path, busyTimeoutMs);
    return path;
}

} // namespace

// An absolute path is never taken for a URI or for ":memory:".
LogStore::LogStore(const std::string &path, const LogStoreOptions &options)
    : path_(std::filesystem::absolute(path)),
      db_(CreateWhereMissing(path_, options.busyTimeoutMs),
          {.mode = SqliteMode::kWrite, .busyTimeoutMs = options.busyTimeoutMs}),
      batch_(db_) {
    FillEmpty();
    if (!options.mustSyncCommits)
        db_.Run("PRAGMA synchronous=NORMAL");
    insertLogs_.emplace(db_, kInsertLogs);
}

LogStore::~LogStore() {
    // SQLite leaves the write-ahead log of a moved file behind, where a fresh database would be taken for its
    // owner.
    if (HasMoved())
        db_.Checkpoint(true);
}

// A file that somebody has opened before anybody stored something in it has no table yet.
void LogStore::FillEmpty() {
    const auto isEmpty = [this] { return !SqliteStatement(db_, "SELECT 1 FROM sqlite_schema").Step(); };
    if (!isEmpty())
        return;
    db_.Run("PRAGMA journal_mode=WAL");
    SqliteTransaction transaction(db_);
    if (isEmpty())
        db_.Run(kLogsTables);
    transaction.Commit();
}

std::optional<StoreProgress> LogStore::ProgressGet(const std::string &source) {
    PrepareProgress();
    SqliteStatement load(db_, kLoadProgress);
    load.Bind(1, source);
    if (!load.Step())
        return std::nullopt;
    return StoreProgress{source, load.Blob(0), static_cast<uint64_t>(load.Number(1)),
                         static_cast<uint64_t>(load.Number(2))};
}

void LogStore::Store(std::span<const _SYSLOG_LOG_DATA_tag> logs) {
    SqliteTransaction transaction(db_);
    InsertLogs(logs);
    transaction.Commit();
}

void LogStore::Store(std::span<const _SYSLOG_LOG_DATA_tag> logs, const StoreProgress &progress) {
    PrepareProgress();
    SqliteTransaction transaction(db_);
    InsertLogs(logs);
    SaveProgress(progress);
    transaction.Commit();
}

void LogStore::Store(std::span<const _SYSLOG_LOG_DATA_tag> logs,
                     const std::function<void(SqliteConnection &)> &alongside) {
    SqliteTransaction transaction(db_);
    InsertLogs(logs);
    alongside(db_);
    transaction.Commit();
}

void LogStore::PrepareProgress() {
    if (saveProgress_)
        return;
    db_.Run(kCreateProgress);
    saveProgress_.emplace(db_, kSaveProgress);
}

void LogStore::InsertLogs(std::span<const _SYSLOG_LOG_DATA_tag> logs) {
    batch_.Set(logs);
    insertLogs_->Run();
    batch_.Set({});
}

void LogStore::SaveProgress(const StoreProgress &progress) {
    saveProgress_->Bind(1, progress.source);
    saveProgress_->BindBlob(2, progress.head);
    saveProgress_->Bind(3, static_cast<int64_t>(progress.offset));
    saveProgress_->Bind(4, static_cast<int64_t>(progress.lines));
    saveProgress_->Run();
}

} // namespace kelo::tool
