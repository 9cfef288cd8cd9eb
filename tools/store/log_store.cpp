#include "store/log_store.h"

#include <sqlite3.h>

#include <cstring>
#include <filesystem>

#include "keloplatform/kelodb.h"
#include "kelosyslog/failure.h"

namespace kelo::tool {
namespace {

constexpr char kCreateProgress[] = "CREATE TABLE IF NOT EXISTS parse_progress("
                                   "source TEXT PRIMARY KEY, head BLOB, offset INTEGER, lines INTEGER)";
constexpr char kLoadProgress[] = "SELECT head,offset,lines FROM parse_progress WHERE source=?1";
constexpr char kSaveProgress[] =
    "INSERT OR REPLACE INTO parse_progress(source,head,offset,lines) VALUES(?1,?2,?3,?4)";

void SaveProgress(SqliteConnection &database, const StoreProgress &progress) {
    database.Run(kCreateProgress);
    SqliteStatement save(database, kSaveProgress);
    save.Bind(1, progress.source);
    save.BindBlob(2, progress.head);
    save.Bind(3, static_cast<int64_t>(progress.offset));
    save.Bind(4, static_cast<int64_t>(progress.lines));
    save.Run();
}

struct Alongside {
    const std::function<void(SqliteConnection &)> &write;
    const std::string &path;
};

// What is thrown here passes through the library, which rolls back.
int RunAlongside(DBConnect_tag *connection, void *context) {
    const auto &alongside = *static_cast<const Alongside *>(context);
    SqliteConnection database(KELODBInternalDBHdlGet(connection), alongside.path);
    alongside.write(database);
    return 0;
}

} // namespace

LogStore::LogStore(const std::string &path, const SyslogDBWriterOptions &options)
    : path_(std::filesystem::absolute(path)), writer_(path_, options) {
    Require(writer_.Open());
}

void LogStore::Require(int result) const {
    if (result == 0)
        return;
    const KELOFAILURE &failure = *SyslogFailureGet();
    std::string text = path_ + ": " + failure.text;
    if (failure.sqliteCode != 0 && failure.systemCode != 0)
        text += std::string(" (") + std::strerror(failure.systemCode) + ")";
    throw SqliteError(text, failure.sqliteCode != 0 ? failure.sqliteCode & 0xff : SQLITE_CANTOPEN,
                      failure.systemCode);
}

std::optional<StoreProgress> LogStore::ProgressGet(const std::string &source) {
    Require(writer_.Open());
    SqliteConnection database(KELODBInternalDBHdlGet(writer_.ConnectionGet()), path_);
    database.Run(kCreateProgress);
    SqliteStatement load(database, kLoadProgress);
    load.Bind(1, source);
    if (!load.Step())
        return std::nullopt;
    return StoreProgress{source, load.Blob(0), static_cast<uint64_t>(load.Number(1)),
                         static_cast<uint64_t>(load.Number(2))};
}

void LogStore::Store(std::span<const _SYSLOG_LOG_DATA_tag> logs) {
    Require(writer_.Store(logs.data(), logs.size()));
}

void LogStore::Store(std::span<const _SYSLOG_LOG_DATA_tag> logs, const StoreProgress &progress) {
    Store(logs, [&](SqliteConnection &database) { SaveProgress(database, progress); });
}

void LogStore::Store(std::span<const _SYSLOG_LOG_DATA_tag> logs,
                     const std::function<void(SqliteConnection &)> &alongside) {
    Alongside written{alongside, path_};
    Require(writer_.Store(logs.data(), logs.size(), RunAlongside, &written));
}

} // namespace kelo::tool
