#include "kelosyslog/logger.h"

#include <sqlite3.h>

#include <ctime>
#include <memory>

#include "eventlog/event_database.h"
#include "kelosyslog/debuger.h"

namespace kelo {

bool EventDatabase::Connect() {
    if (handler_.DBCon() == 0)
        return true;
    Debuger::MSG(0, "Fail to connect db");
    return false;
}

} // namespace kelo

namespace {

struct SqliteFree {
    void operator()(char *text) const { sqlite3_free(text); }
};

std::string InsertStatement(int level, const std::string &user, const std::string &event) {
    const auto now = static_cast<unsigned long>(std::time(nullptr));
    const std::unique_ptr<char, SqliteFree> sql(sqlite3_mprintf(
        "INSERT INTO log VALUES(NULL, '%d', '%lu', '%q', '%q');", level, now, user.c_str(), event.c_str()));
    if (sql == nullptr)
        throw std::bad_alloc();
    return sql.get();
}

} // namespace

int Logger::LogAdd(std::string dbPath, int level, std::string user, std::string event) const {
    kelo::EventDatabase db(dbPath);
    if (!db.Connect())
        return -1;
    const bool isOpen = db->DBTranStart() == 0; // else the insert is its own transaction
    const std::string sql = InsertStatement(level, user, event);
    if (db->DBExecute(sql) < 0) {
        // Disconnecting ends the transaction.
        Debuger::MSG(0, "Fail to execute SQL command: " + sql);
        return -1;
    }
    if (db->DBTranEnd() < 0 && isOpen)
        return -1; // for example a full disk: disconnecting rolls back
    if (LogRotation(dbPath) < 0)
        Debuger::MSG(0, "Fail to rotate log database");
    return 0;
}
