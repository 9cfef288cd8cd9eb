// Storing a million records through LogStore, compared with a bare loop of one prepared insert per row in the
// same batches, each into a fresh database in the current folder. Commits are not synced, as in the receiver:
// the disk would be measured otherwise.

#include <sqlite3.h>

#include <filesystem>
#include <vector>

#include "kelosyslog/logparser.h"
#include "log_text.h"
#include "store/log_store.h"
#include "store/logs_schema.h"
#include "support/measure.h"

using namespace kelo::bench;
using kelo::tool::LogStore;

namespace {

constexpr int kRows = 1'000'000;
constexpr size_t kBatchRows = 5000;
using Logs = std::vector<_SYSLOG_LOG_DATA_tag>;

void Require(int status) {
    if (status != SQLITE_OK && status != SQLITE_DONE)
        Fail(std::string("SQLite: ") + sqlite3_errstr(status));
}

void StoreBare(const std::string &path, const Logs &logs) {
    sqlite3 *db = nullptr;
    Require(sqlite3_open(path.c_str(), &db));
    Require(
        sqlite3_exec(db, "PRAGMA journal_mode=WAL; PRAGMA synchronous=NORMAL", nullptr, nullptr, nullptr));
    Require(sqlite3_exec(db, kelo::tool::kLogsSchema, nullptr, nullptr, nullptr));
    sqlite3_stmt *insert = nullptr;
    Require(sqlite3_prepare_v2(
        db,
        "INSERT INTO logs(host,ip,fac,prio,llevel,tag,utcsec,tzoffset,ldate,ltime,prog,msg) "
        "VALUES(?,?,?,?,?,?,?,?,?,?,?,?)",
        -1, &insert, nullptr));
    for (size_t row = 0; row < logs.size(); ++row) {
        if (row % kBatchRows == 0)
            Require(sqlite3_exec(db, "BEGIN IMMEDIATE", nullptr, nullptr, nullptr));
        const _SYSLOG_LOG_DATA_tag &log = logs[row];
        int column = 0;
        const auto bind = [&](const std::string &text) {
            sqlite3_bind_text(insert, ++column, text.data(), static_cast<int>(text.size()), SQLITE_STATIC);
        };
        const std::string prio = g_MappingSyslogPrior[log.prio];
        for (const std::string *text : {&log.host, &log.ip, &log.fac, &prio, &prio, &log.tag})
            bind(*text);
        sqlite3_bind_int64(insert, ++column, log.utcsec);
        for (const std::string *text : {&log.tzoffset, &log.ldate, &log.ltime, &log.prog, &log.msg})
            bind(*text);
        Require(sqlite3_step(insert));
        sqlite3_reset(insert);
        if ((row + 1) % kBatchRows == 0 || row + 1 == logs.size())
            Require(sqlite3_exec(db, "COMMIT", nullptr, nullptr, nullptr));
    }
    sqlite3_finalize(insert);
    sqlite3_close(db);
}

void StoreThrough(const std::string &path, const Logs &logs) {
    LogStore store(path, {.mustSyncCommits = false});
    for (size_t row = 0; row < logs.size(); row += kBatchRows) {
        const size_t count = std::min(kBatchRows, logs.size() - row);
        store.Store({logs.data() + row, count}, {"bench", std::string(4096, 'h'), row + count, row + count});
    }
}

// Time of one run into a database that exists only for it.
template <typename Store>
double FreshRunMs(Store store, const Logs &logs) {
    const std::string path = "bench_store.db";
    const double elapsed = Time([&] { store(path, logs); });
    for (const char *suffix : {"", "-wal", "-shm"})
        std::filesystem::remove(path + suffix);
    return elapsed;
}

} // namespace

int main() {
    std::string text = LogText(kRows);
    LogParser parser;
    parser.LogAdd(text);
    std::list<_SYSLOG_LOG_DATA_tag> list = parser.LogListTake();
    const Logs logs(std::make_move_iterator(list.begin()), std::make_move_iterator(list.end()));
    list.clear();
    const auto times = MedianTimes({{"LogStore", [&] { return FreshRunMs(StoreThrough, logs); }},
                                    {"bare loop", [&] { return FreshRunMs(StoreBare, logs); }}},
                                   3);
    PrintHeading("Storing 1000000 records in batches of 5000", "ms");
    return PrintRatio("LogStore", times[0], "bare prepared inserts", times[1], 0.65) ? 0 : 1;
}
