#include "db/connection.h"

#include <unistd.h>

#include <chrono>
#include <memory>
#include <new>
#include <thread>
#include <utility>

#include "common/failure.h"
#include "db/cluster_connection.h"
#include "search/regexp_function.h"

using kelo::platform::Database;

namespace {

using std::chrono::steady_clock;
constexpr std::chrono::seconds kPatience{5};

struct Limit {
    int id;
    int value;
};
// Far above what a record needs and far below what a damaged file can request.
constexpr Limit kLimits[] = {
    {SQLITE_LIMIT_ATTACHED, 1},          // VACUUM attaches its copy
    {SQLITE_LIMIT_LENGTH, 64 << 20},     // bytes of a value or a row
    {SQLITE_LIMIT_SQL_LENGTH, 16 << 20}, // bytes of a statement
    {SQLITE_LIMIT_WORKER_THREADS, 0},
};

// Lets SQL attach nothing but a nameless temporary database, which is what VACUUM does.
int Authorize(void *, int action, const char *file, const char *, const char *, const char *) {
    const bool attachesFile = action == SQLITE_ATTACH && (file == nullptr || file[0] != '\0');
    return attachesFile ? SQLITE_DENY : SQLITE_OK;
}

// The content of a file must not make SQLite do more than read it, and SQL must not reach outside the file.
bool Harden(sqlite3 *db) {
    for (const Limit &limit : kLimits)
        sqlite3_limit(db, limit.id, limit.value);
    return sqlite3_db_config(db, SQLITE_DBCONFIG_DEFENSIVE, 1, nullptr) == SQLITE_OK &&
           sqlite3_db_config(db, SQLITE_DBCONFIG_TRUSTED_SCHEMA, 0, nullptr) == SQLITE_OK &&
           sqlite3_db_config(db, SQLITE_DBCONFIG_ENABLE_LOAD_EXTENSION, 0, nullptr) == SQLITE_OK &&
           sqlite3_db_config(db, SQLITE_DBCONFIG_ENABLE_FTS3_TOKENIZER, 0, nullptr) == SQLITE_OK &&
           sqlite3_set_authorizer(db, Authorize, nullptr) == SQLITE_OK &&
           sqlite3_exec(db, "PRAGMA cell_size_check=ON", nullptr, nullptr, nullptr) == SQLITE_OK;
}

// Asks for a lock every millisecond: with the growing pauses of SQLite's own handler it would hardly ever hit
// the short moment between two transactions of a busy writer.
int WaitForLock(void *, int calls) {
    thread_local steady_clock::time_point start; // tries take longer on a busy machine
    const steady_clock::time_point now = steady_clock::now();
    if (calls == 0)
        start = now;
    if (now - start >= kPatience)
        return 0;
    std::this_thread::sleep_for(std::chrono::milliseconds(1));
    return 1;
}

bool HasMoved(sqlite3 *db) {
    int hasMoved = 0;
    sqlite3_file_control(db, "main", SQLITE_FCNTL_HAS_MOVED, &hasMoved);
    return hasMoved != 0;
}

// Opens the write-ahead log too and returns whether the file kept its name meanwhile. SQLite opens the log at
// the first read, by its name: of a file that was moved since, that is the log of the one that came after it.
bool OpenLog(sqlite3 *db) {
    if (HasMoved(db))
        return false;
    const char *log = sqlite3_filename_wal(sqlite3_db_filename(db, "main"));
    // The connection that closes last has the file for itself while it deletes the log.
    for (int calls = 0; sqlite3_exec(db, "PRAGMA user_version", nullptr, nullptr, nullptr) == SQLITE_BUSY &&
                        access(log, F_OK) == 0 && WaitForLock(nullptr, calls) != 0;
         ++calls) {
    }
    return !HasMoved(db);
}

DBConnect_tag *Refuse(const char *path, int error) {
    kelo::platform::FailWithErrno("KELODBConnect", path, error);
    return nullptr;
}

} // namespace

DBConnect_tag *KELODBConnect(const char *, const char *, const char *, const char *path) {
    if (path == nullptr || path[0] == '\0')
        return Refuse("", EINVAL);
    try {
        auto connection = std::make_unique<DBConnect_tag>(path);
        Database db;
        do {
            db = connection->file.Open();
            if (db == nullptr)
                return Refuse(path, errno);
            if (kelo::platform::DescribesCluster(db.get()))
                return kelo::platform::ConnectToCluster(std::move(connection), path);
            if (!Harden(db.get()) || !kelo::platform::RegisterSearchFunctions(db.get())) {
                kelo::platform::FailStatement(db.get(), "KELODBConnect");
                return nullptr;
            }
        } while (!OpenLog(db.get()));
        sqlite3_busy_handler(db.get(), WaitForLock, nullptr); // fails only without a connection
        connection->db = db.release();
        return connection.release();
    } catch (const std::bad_alloc &) {
        return Refuse(path, ENOMEM);
    }
}

int KELODBClose(DBConnect_tag *connection) {
    if (connection == nullptr)
        return 0;
    connection->inserts.Clear();
    connection->selects.Clear();
    const int status = sqlite3_close(connection->db);
    if (status != SQLITE_OK)
        kelo::platform::FailStatement(connection->db, "KELODBClose");
    delete connection;
    return status == SQLITE_OK ? 0 : -1;
}

const char *KELODBErrorGet(DBConnect_tag *connection) {
    return connection != nullptr ? sqlite3_errmsg(connection->db) : "not connected";
}

sqlite3 *KELODBInternalDBHdlGet(DBConnect_tag *connection) {
    return connection != nullptr ? connection->db : nullptr;
}
