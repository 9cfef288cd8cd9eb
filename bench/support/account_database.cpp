#include "support/account_database.h"

#include <filesystem>
#include <fstream>
#include <iterator>

#include "support/measure.h"

namespace kelo::bench {

Database OpenDatabase(const std::string &path) {
    sqlite3 *db = nullptr;
    if (sqlite3_open(path.c_str(), &db) != SQLITE_OK)
        Fail("cannot open " + path);
    return Database(db);
}

Query Prepare(sqlite3 *db, const char *sql) {
    sqlite3_stmt *statement = nullptr;
    if (sqlite3_prepare_v2(db, sql, -1, &statement, nullptr) != SQLITE_OK)
        Fail(std::string(sql) + ": " + sqlite3_errmsg(db));
    return Query(statement);
}

void Run(sqlite3 *db, const std::string &sql) {
    if (sqlite3_exec(db, sql.c_str(), nullptr, nullptr, nullptr) != SQLITE_OK)
        Fail(sql + ": " + sqlite3_errmsg(db));
}

std::string CreateAccountDatabase(const std::string &root) {
    const std::string path = root + "/var/log/kelolog/.KELOACCOUNTDB";
    std::filesystem::create_directories(root + "/var/log/kelolog");
    for (const char *companion : {"", "-wal", "-shm"})
        std::filesystem::remove(path + companion);
    std::ifstream schema(KELO_SCHEMAS "/accinfo.sql");
    const Database db = OpenDatabase(path);
    Run(db.get(), std::string(std::istreambuf_iterator<char>(schema), {}));
    Run(db.get(), "PRAGMA journal_mode=WAL");
    return path;
}

std::string DeviceName(int number) {
    return (number < 10 ? "device0" : "device") + std::to_string(number);
}

void InsertSamples(sqlite3 *db, int first, int count) {
    constexpr int kDevices = 50;
    const Query insert = Prepare(db, "INSERT INTO eps VALUES(NULL, ?, ?, ?)");
    Run(db, "BEGIN");
    for (int stamp = first; stamp < first + count; ++stamp) {
        for (int device = 0; device < kDevices; ++device) {
            const std::string name = DeviceName(device);
            sqlite3_bind_int(insert.get(), 1, stamp);
            sqlite3_bind_text(insert.get(), 2, name.c_str(), -1, SQLITE_STATIC);
            sqlite3_bind_int(insert.get(), 3, 1);
            if (sqlite3_step(insert.get()) != SQLITE_DONE)
                Fail(sqlite3_errmsg(db));
            sqlite3_reset(insert.get());
        }
    }
    Run(db, "END");
}

} // namespace kelo::bench
