#include "db/connection.h"

#include <memory>
#include <new>

#include "search/regexp_function.h"

namespace {

constexpr int kBusyTimeoutMs = 5000;

// Data read from a file must not be able to make SQLite do more than read it.
bool Harden(sqlite3 *db) {
    return sqlite3_db_config(db, SQLITE_DBCONFIG_DEFENSIVE, 1, nullptr) == SQLITE_OK &&
           sqlite3_db_config(db, SQLITE_DBCONFIG_TRUSTED_SCHEMA, 0, nullptr) == SQLITE_OK &&
           sqlite3_db_config(db, SQLITE_DBCONFIG_ENABLE_LOAD_EXTENSION, 0, nullptr) == SQLITE_OK &&
           sqlite3_limit(db, SQLITE_LIMIT_ATTACHED, 0) >= 0;
}

} // namespace

DBConnect_tag *KELODBConnect(const char *, const char *, const char *, const char *path) {
    if (path == nullptr || path[0] != '/')
        return nullptr;
    std::unique_ptr<DBConnect_tag> connection(new (std::nothrow) DBConnect_tag);
    if (connection == nullptr)
        return nullptr;
    // SQLite itself falls back to read-only where the file cannot be written.
    const int flags = SQLITE_OPEN_READWRITE | SQLITE_OPEN_NOMUTEX;
    const int status = sqlite3_open_v2(path, &connection->db, flags, nullptr);
    if (status != SQLITE_OK || !Harden(connection->db) ||
        !kelo::platform::RegisterSearchFunctions(connection->db)) {
        sqlite3_close(connection->db);
        return nullptr;
    }
    sqlite3_busy_timeout(connection->db, kBusyTimeoutMs);
    return connection.release();
}

int KELODBClose(DBConnect_tag *connection) {
    if (connection == nullptr)
        return 0;
    const int status = sqlite3_close(connection->db);
    delete connection;
    return status == SQLITE_OK ? 0 : -1;
}

const char *KELODBErrorGet(DBConnect_tag *connection) {
    return connection != nullptr ? sqlite3_errmsg(connection->db) : "not connected";
}

sqlite3 *KELODBInternalDBHdlGet(DBConnect_tag *connection) {
    return connection != nullptr ? connection->db : nullptr;
}
