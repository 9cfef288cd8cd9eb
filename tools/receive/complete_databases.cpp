#include "receive/complete_databases.h"

#include <unistd.h>

#include <initializer_list>

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

} // namespace

void CompleteDatabases(const std::string &root) {
    const std::string schemas = root + "/usr/kelo/syslog/schema/";
    Complete(root + "/var/log/kelolog/.KELOACCOUNTDB", schemas + "accinfo.sql", {"eps", "histogram"});
    Complete(root + "/usr/kelo/etc/kelosyslog.db", schemas + "kelosyslog.sql", {"log"});
}

} // namespace kelo::tool
