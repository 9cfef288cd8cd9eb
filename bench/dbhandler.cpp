// The database handler against plain SQLite calls with the same open flags, settings and pragmas: a
// connection for one statement, and a one-row query on an open connection.

#include <sqlite3.h>

#include <string>

#include "keloplatform/kelodb.h"
#include "kelosyslog/dbhandler.h"
#include "support/log_database.h"
#include "support/measure.h"

using namespace kelo::bench;

namespace {

constexpr int kRounds = 25;
constexpr int kCalls = 400; // a sample is the mean of this many calls
constexpr char kQuery[] = "SELECT id, host, prog, utcsec FROM logs WHERE id = 7";
// The values of the row, so that both ways have to read them.
constexpr const char *kColumns[] = {"id", "host", "prog", "utcsec"};

void Require(bool isDone) {
    if (!isDone)
        Fail("a statement failed");
}

sqlite3 *Open(const std::string &path) {
    sqlite3 *db = nullptr;
    constexpr int kFlags = SQLITE_OPEN_READWRITE | SQLITE_OPEN_NOMUTEX;
    Require(sqlite3_open_v2(path.c_str(), &db, kFlags, nullptr) == SQLITE_OK &&
            sqlite3_busy_timeout(db, 5000) == SQLITE_OK &&
            sqlite3_db_config(db, SQLITE_DBCONFIG_DEFENSIVE, 1, nullptr) == SQLITE_OK &&
            sqlite3_db_config(db, SQLITE_DBCONFIG_TRUSTED_SCHEMA, 0, nullptr) == SQLITE_OK &&
            sqlite3_exec(db, "PRAGMA cell_size_check=ON", nullptr, nullptr, nullptr) == SQLITE_OK);
    return db;
}

size_t Query(sqlite3 *db) {
    sqlite3_stmt *statement = nullptr;
    Require(sqlite3_prepare_v2(db, kQuery, -1, &statement, nullptr) == SQLITE_OK);
    size_t bytes = 0;
    while (sqlite3_step(statement) == SQLITE_ROW) {
        for (int column = 0; column < 4; ++column)
            bytes +=
                std::string(reinterpret_cast<const char *>(sqlite3_column_text(statement, column))).size();
    }
    Require(bytes > 0 && sqlite3_finalize(statement) == SQLITE_OK);
    return bytes;
}

int TakeRow(DBResult_tag *result, void *context) {
    unsigned int row = 0;
    while (KELODBFetchRow(result, &row) >= 0) {
        for (const char *column : kColumns)
            *static_cast<size_t *>(context) += std::string(KELODBFetchField(result, row, column)).size();
    }
    return 0;
}

void Query(DBHandler &db) {
    size_t bytes = 0;
    Require(db.DBExecute(kQuery, TakeRow, &bytes) == 0 && bytes > 0);
}

Variant Repeated(const std::string &name, const std::function<void()> &work) {
    return {name, [work] {
                return 1000 * Time([&] {
                           for (int call = 0; call < kCalls; ++call)
                               work();
                       }) /
                       kCalls;
            }};
}

} // namespace

int main() {
    const std::string path = LogDatabase(1000);
    DBHandler db(path, ""); // stays connected: the last to close would empty the write-ahead log
    Require(db.DBCon() == 0);
    sqlite3 *plain = Open(path);
    const auto times = MedianTimes({Repeated("handler",
                                             [&] {
                                                 DBHandler one(path, "");
                                                 Require(one.DBCon() == 0);
                                                 Query(one);
                                                 one.DBDiscon();
                                             }),
                                    Repeated("plain",
                                             [&] {
                                                 sqlite3 *one = Open(path);
                                                 Query(one);
                                                 sqlite3_close(one);
                                             }),
                                    Repeated("handler query", [&] { Query(db); }),
                                    Repeated("plain query", [&] { Query(plain); })},
                                   kRounds);
    sqlite3_close(plain);
    db.DBDiscon();
    PrintHeading("The database handler", "us");
    bool allKept =
        PrintRatio("connect, query, disconnect", times[0], "the same in SQLite calls", times[1], 1.15);
    allKept = PrintRatio("one-row query", times[2], "the same in SQLite calls", times[3], 1.15) && allKept;
    return allKept ? 0 : 1;
}
