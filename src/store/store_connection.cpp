#include "store/store_connection.h"

#include <sqlite3.h>

#include <chrono>
#include <thread>

#include "store/new_database.h"
#include "store/write_transaction.h"

namespace kelo {
namespace {

// Columns as in logs.sql.
constexpr char kInsertLogs[] =
    "INSERT INTO logs(host,ip,fac,prio,llevel,tag,utcsec,tzoffset,ldate,ltime,prog,msg) "
    "SELECT host,ip,fac,prio,llevel,tag,utcsec,tzoffset,ldate,ltime,prog,msg FROM kelo_records";

// A batch changes pages of every index. With SQLite's own sizes, 2 MiB and 4 MiB, they would leave the cache
// within a batch, and be copied into the database after every second one.
constexpr char kCacheSize[] = "PRAGMA cache_size=-16000";
constexpr char kCheckpointSize[] = "PRAGMA wal_autocheckpoint=4000";

} // namespace

std::unique_ptr<StoreConnection> StoreConnection::Open(const std::string &dbPath,
                                                       const SyslogDBWriterOptions &options) {
    if (CreateLogDatabase(dbPath) != 0)
        return nullptr;
    std::unique_ptr<StoreConnection> opened(new StoreConnection(dbPath, options.busyTimeoutMs));
    opened->connection_ = ConnectOrFail(dbPath);
    return opened->connection_ != nullptr && opened->Prepare(options) == 0 ? std::move(opened) : nullptr;
}

int StoreConnection::Prepare(const SyslogDBWriterOptions &options) {
    sqlite3 *db = KELODBInternalDBHdlGet(Get());
    if (sqlite3_busy_handler(db, WaitForLock, this) != SQLITE_OK || records_.Register(db) != SQLITE_OK)
        return FailStatement(Get(), dbPath_, "KELODBConnect");
    if (FillEmptyDatabase(Get(), dbPath_) != 0)
        return -1;
    for (const char *size : {kCacheSize, kCheckpointSize}) {
        if (RunStatement(Get(), dbPath_, size) != 0)
            return -1;
    }
    return options.mustSyncCommits ? 0 : RunStatement(Get(), dbPath_, "PRAGMA synchronous=NORMAL");
}

StoreConnection::~StoreConnection() {
    // SQLite leaves the write-ahead log of a moved file behind, where a fresh database would be taken for its
    // owner.
    if (connection_ != nullptr && HasMoved(Get()))
        KELODBExecute(Get(), "PRAGMA wal_checkpoint(TRUNCATE)", nullptr);
}

int StoreConnection::Run(SyslogDBWriterCallback alongside, void *context) {
    WriteTransaction transaction(Get(), dbPath_);
    if (transaction.Begin() != 0 || RunStatement(Get(), dbPath_, kInsertLogs) != 0)
        return -1;
    if (alongside != nullptr && alongside(Get(), context) != 0) {
        const int code = sqlite3_errcode(KELODBInternalDBHdlGet(Get()));
        return code != SQLITE_OK && code != SQLITE_ROW && code != SQLITE_DONE
                   ? FailStatement(Get(), dbPath_, "alongside")
                   : Fail(KELO_FAILURE_OTHER, dbPath_, "alongside", "the callback did not succeed");
    }
    return transaction.Commit();
}

int StoreConnection::Refuse(size_t row) {
    return Fail(KELO_FAILURE_ARGUMENT, dbPath_, "Store",
                "record " + std::to_string(row) + " has a severity that is none of 0 to 7");
}

// Asks for the lock every millisecond: with the growing pauses of SQLite's own handler it would hardly ever
// hit the short moment between two transactions of a busy writer.
int StoreConnection::WaitForLock(void *connection, int calls) {
    using std::chrono::steady_clock;
    thread_local steady_clock::time_point start; // tries take longer on a busy machine
    const steady_clock::time_point now = steady_clock::now();
    if (calls == 0)
        start = now;
    if (now - start >= std::chrono::milliseconds(static_cast<StoreConnection *>(connection)->busyTimeoutMs_))
        return 0;
    std::this_thread::sleep_for(std::chrono::milliseconds(1));
    return 1;
}

} // namespace kelo
