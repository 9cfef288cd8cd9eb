#include <sqlite3.h>
#include <syslog.h>

#include "db/catalogue.h"
#include "keloplatform/kelodb.h"
#include "kelosyslog/dbhandler.h"

void DBHandler::DBErrorHandle(std::string sql) {
    // Both are read first: the reactions below run statements on the same connection.
    const int code = sqlite3_errcode(KELODBInternalDBHdlGet(connection_));
    const std::string cause = KELODBErrorGet(connection_);

    int priority = LOG_ERR;
    switch (code) {
    case SQLITE_ERROR:
        // A wrong statement does not harm a database that has its table. The check is not repeated when the
        // check itself fails.
        if (sql != kelo::CatalogueQuery("logs") && DBcheckTableExist("logs"))
            priority = LOG_INFO;
        break;
    case SQLITE_BUSY:
    case SQLITE_EMPTY:
    case SQLITE_NOTADB:
        priority = LOG_INFO;
        break;
    case SQLITE_CORRUPT:
        DBErrorHandle_SQLITE_CORRUPT(connection_, dbPath_);
        break;
    default:
        break;
    }
    syslog(priority, "%s:%d Fail to execute SQL command: %s, error code is : %d, error cause: %s",
           "dbhandler", __LINE__, sql.c_str(), code, cause.c_str());
}
