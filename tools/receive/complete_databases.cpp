#include "receive/complete_databases.h"

#include <syslog.h>
#include <unistd.h>

#include <cerrno>
#include <cstdio>
#include <cstring>
#include <initializer_list>

#include "base/sqlite.h"
#include "kelosyslog/dbhandler.h"

namespace kelo::tool {
namespace {

bool HasTables(DBHandler &db, std::initializer_list<const char *> tables) {
    for (const char *table : tables) {
        if (!db.DBcheckTableExist(table))
            return false;
    }
    return true;
}

void Complete(const std::string &path, const std::string &schema,
              std::initializer_list<const char *> tables) {
    if (access(path.c_str(), F_OK) != 0)
        return;
    DBHandler db(path, schema);
    if (db.DBCon() != 0)
        return;
    const bool isComplete = HasTables(db, tables);
    db.DBDiscon();
    if (!isComplete)
        db.DBCreate(); // its statements do not change existing tables
}

// False also for a file that cannot be read as a database: then nothing is loaded.
bool HasViews(const std::string &path) {
    try {
        SqliteConnection database(path, {.busyTimeoutMs = 1000, .trustsSchema = false});
        return database.Number(
                   "SELECT count(*) FROM sqlite_master WHERE lower(name) IN ('eps', 'histogram') AND "
                   "(type = 'view' OR sql LIKE 'create virtual%')") != 0;
    } catch (const SqliteError &) {
        return false;
    }
}

} // namespace

void PutAsideIfItHasViews(const std::string &path) {
    if (!HasViews(path))
        return;
    syslog(LOG_ERR, "%s has views in place of its tables and is put aside", path.c_str());
    DBErrorHandle_SQLITE_CORRUPT(nullptr, path);
    // That needs a notification to be sent.
    if (HasViews(path) && std::rename(path.c_str(), (path + ".corrupt").c_str()) != 0)
        throw DatabaseError("cannot rename " + path + ": " + std::strerror(errno));
}

void CompleteDatabases(const std::string &root) {
    const std::string schemas = root + "/usr/kelo/syslog/schema/";
    Complete(root + "/var/log/kelolog/.KELOACCOUNTDB", schemas + "accinfo.sql", {"eps", "histogram"});
    Complete(root + "/usr/kelo/etc/kelosyslog.db", schemas + "kelosyslog.sql", {"log"});
}

} // namespace kelo::tool
