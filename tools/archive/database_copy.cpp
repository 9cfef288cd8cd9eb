#include "archive/database_copy.h"

#include <sqlite3.h>

#include <algorithm>
#include <filesystem>

#include "archive/archive_schema.h"
#include "archive/open_options.h"
#include "base/errors.h"
#include "base/stop_signals.h"
#include "kelosyslog/dbhandler.h"
#include "read/failure_reason.h"
#include "read/log_table.h"

namespace kelo::tool {
namespace {

constexpr int kPagesPerStep = 1024;

SqliteConnection OpenSource(const std::string &path) {
    std::error_code error;
    if (!std::filesystem::is_regular_file(path, error)) // a pipe would wait for its other end
        throw DatabaseError(DescribeDatabaseProblem({path}));
    return {path, kToWrite}; // WAL mode needs to write its shared memory even for reading
}

uint64_t CountIn(SqliteConnection &database, const std::string &host) {
    return static_cast<uint64_t>(host.empty()
                                     ? database.Number("SELECT count(*) FROM logs")
                                     : database.Number("SELECT count(*) FROM logs WHERE host = ?1", host));
}

// Copies the pages of what `source` sees. Its open transaction keeps that the same: without one the copying
// would begin anew with every write of another connection.
void CopyPages(SqliteConnection &source, SqliteConnection &copy,
               const std::function<void(uint64_t)> &onCopied) {
    const auto pageSize = static_cast<uint64_t>(source.Number("PRAGMA page_size"));
    const std::unique_ptr<sqlite3_backup, int (*)(sqlite3_backup *)> backup(
        sqlite3_backup_init(copy.Get(), "main", source.Get(), "main"), sqlite3_backup_finish);
    if (backup == nullptr)
        copy.Fail(sqlite3_errcode(copy.Get()));
    int before = 0;
    for (int status = SQLITE_OK; status == SQLITE_OK;) {
        StopSignals::Check();
        status = sqlite3_backup_step(backup.get(), kPagesPerStep);
        if (status != SQLITE_OK && status != SQLITE_DONE)
            throw DatabaseError(source.Name() + " cannot be copied to " + copy.Name() + ": " +
                                sqlite3_errstr(status));
        const int done = sqlite3_backup_pagecount(backup.get()) - sqlite3_backup_remaining(backup.get());
        onCopied(static_cast<uint64_t>(std::max(done - before, 0)) * pageSize);
        before = done;
    }
}

// Returns the number of the order's logs at the moment that was copied.
uint64_t CopySnapshot(const CopyOrder &order, const std::string &target) {
    SqliteConnection source = OpenSource(order.source);
    source.Run("BEGIN; SELECT 1 FROM sqlite_schema");
    const uint64_t logs = CountIn(source, order.host);
    SqliteConnection copy(target, kToWrite);
    copy.Run("PRAGMA synchronous=OFF; PRAGMA journal_mode=OFF"); // a copy that fails is thrown away
    CopyPages(source, copy, order.onCopied);
    return logs;
}

void RequireSound(SqliteConnection &copy, const std::string &source) {
    std::string finding;
    try {
        finding = copy.Text("PRAGMA integrity_check(1)");
    } catch (const DatabaseError &error) {
        finding = error.what();
    }
    if (finding != "ok")
        throw DatabaseError(source + " is damaged, so it is not archived: " + finding);
}

void AddSchema(SqliteConnection &copy, const std::string &source) {
    try {
        copy.Run(kArchiveTables);
    } catch (const DatabaseError &error) { // for example where a column lacks
        throw DatabaseError(source + " cannot be archived: " + error.what());
    }
}

// Drops what does not belong into the archive; returns the path of the temporary file that is the archive.
std::string Refine(const CopyOrder &order, const std::string &path, ArchiveFolder &folder) {
    SqliteConnection copy(path, kToWrite);
    copy.Run("PRAGMA synchronous=OFF; PRAGMA journal_mode=OFF"); // ends the WAL mode of the source
    if (copy.Text("PRAGMA journal_mode") != "off")
        throw DatabaseError(path + ": cannot leave write-ahead logging");
    RequireSound(copy, order.source);
    if (!order.host.empty())
        copy.Run("DELETE FROM logs WHERE host IS NOT ?1", order.host);
    AddSchema(copy, order.source);
    if (copy.Number("PRAGMA freelist_count") == 0)
        return path;
    std::string compact = folder.NewTemporary();
    copy.Run("VACUUM INTO ?1", compact);
    return compact;
}

// Writes the row of db_info and reads the dates.
bool WriteDescription(DBHandler &db, const std::string &device, DatabaseCopy &copy) {
    if (db.DBCon() != 0)
        return false;
    const auto start = static_cast<unsigned long long>(std::max<int64_t>(db.DBLogStartTimeGet(), 0));
    const auto end = static_cast<unsigned long long>(std::max<int64_t>(db.DBLogEndTimeGet(), 0));
    copy.firstDate = db.DBInfoStartStrGet();
    copy.lastDate = db.DBInfoEndStrGet();
    // No operation of the handler writes the number of logs.
    const std::string count = "UPDATE db_info SET log_count='" + std::to_string(copy.logs) + "' WHERE id=1";
    _ARCH_DB_INFO_tag written;
    return db.DBInfoStartSet(start) == 0 && db.DBInfoEndSet(end) == 0 &&
           db.DBInfoDevSet(db.DBCmdEscape(device)) == 0 && db.DBExecute(count) == 0 &&
           db.DBInfoGet(written) == 0 && written.log_count == copy.logs && written.device == device;
}

void Describe(const std::string &device, DatabaseCopy &copy) {
    DBHandler db(copy.path, "");
    SyslogFailureClear();
    const bool isWritten = WriteDescription(db, device, copy);
    db.DBDiscon();
    if (!isWritten)
        throw DatabaseError(copy.path + ": cannot write its description: " + WhyFailed(copy.path));
}

} // namespace

uint64_t CountLogs(const std::string &source, const std::string &host) {
    SqliteConnection database = OpenSource(source);
    return CountIn(database, host);
}

DatabaseCopy CopyDatabase(const CopyOrder &order, ArchiveFolder &folder) {
    DatabaseCopy copy;
    const std::string whole = folder.NewTemporary();
    copy.logs = CopySnapshot(order, whole);
    copy.path = Refine(order, whole, folder);
    if (copy.path != whole)
        folder.RemoveTemporary(whole);
    Describe(order.device, copy);
    SqliteConnection written(copy.path, kToRead);
    if (const uint64_t found = CountIn(written, ""); found != copy.logs)
        throw DatabaseError(order.source + ": the copy holds " + std::to_string(found) + " logs instead of " +
                            std::to_string(copy.logs));
    return copy;
}

DatabaseCopy MakeArchive(const CopyOrder &order, ArchiveFolder &folder, bool willRemove) {
    DatabaseCopy archive = CopyDatabase(order, folder);
    const std::string name = folder.FreeName(order.device, archive.firstDate, archive.lastDate);
    StopSignals::Check();
    if (willRemove)
        folder.NoteRemoval(name, order.source);
    archive.path = folder.Publish(archive.path, name, order.source);
    return archive;
}

} // namespace kelo::tool
