#include <memory>
#include <new>
#include <string>

#include "db/connection.h"
#include "db/result.h"

namespace {

struct FinalizeStatement {
    void operator()(sqlite3_stmt *statement) const { sqlite3_finalize(statement); }
};
using Statement = std::unique_ptr<sqlite3_stmt, FinalizeStatement>;

int Run(DBConnect_tag *connection, const char *sql, DBResult_tag **result) {
    sqlite3_stmt *raw = nullptr;
    const char *tail = nullptr;
    if (sqlite3_prepare_v2(connection->db, sql, -1, &raw, &tail) != SQLITE_OK)
        return -1;
    const Statement statement(raw);
    if (statement == nullptr)
        return 0;
    std::unique_ptr<DBResult_tag> rows;
    if (result != nullptr && sqlite3_column_count(statement.get()) > 0) {
        rows = std::make_unique<DBResult_tag>();
        kelo::platform::TakeColumns(*rows, statement.get());
    }
    int status;
    while ((status = sqlite3_step(statement.get())) == SQLITE_ROW) {
        if (rows != nullptr)
            kelo::platform::TakeRow(*rows, statement.get());
    }
    if (status != SQLITE_DONE)
        return -1;
    if (result != nullptr)
        *result = rows.release();
    return 0;
}

} // namespace

int KELODBExecute(DBConnect_tag *connection, const char *sql, DBResult_tag **result) {
    if (result != nullptr)
        *result = nullptr;
    if (connection == nullptr || sql == nullptr)
        return -1;
    try {
        return Run(connection, sql, result);
    } catch (const std::bad_alloc &) {
        return -1;
    }
}

int KELODBSelectLimit(DBConnect_tag *connection, const char *sql, unsigned int limit, unsigned int offset,
                      DBResult_tag **result) {
    if (sql == nullptr)
        return -1;
    try {
        const std::string bounded = std::string(sql) + "\nLIMIT " +
                                    (limit == 0 ? "-1" : std::to_string(limit)) + " OFFSET " +
                                    std::to_string(offset);
        return KELODBExecute(connection, bounded.c_str(), result);
    } catch (const std::bad_alloc &) {
        return -1;
    }
}
