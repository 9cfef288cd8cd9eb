// Small searches on a connection that the program keeps, against prepared statements on a kept connection of
// SQLite whose rows are read into the same records.

#include <sqlite3.h>

#include <string>

#include "kelosyslog/dbreader.h"
#include "support/log_database.h"
#include "support/measure.h"

using namespace kelo::bench;

namespace {

constexpr int kRows = 100000;
constexpr int kRounds = 25;
constexpr int kCalls = 100; // a sample is the mean of this many calls
constexpr int kPageRows = 50;

using Log = _SYSLOG_LOG_DATA_tag;
using Conditions = std::list<_SYSLOG_SQL_COND_tag>;

size_t bytesSeen = 0;

int TakeRow(Log &log, void *context) {
    bytesSeen += log.msg.size();
    ++*static_cast<int *>(context);
    return 0;
}

// What a program writes that uses SQLite itself.
class KeptStatement {
public:
    KeptStatement(const std::string &path, const char *sql) {
        if (sqlite3_open_v2(path.c_str(), &db_, SQLITE_OPEN_READWRITE, nullptr) != SQLITE_OK ||
            sqlite3_prepare_v2(db_, sql, -1, &statement_, nullptr) != SQLITE_OK)
            Fail(sqlite3_errmsg(db_));
    }
    ~KeptStatement() {
        sqlite3_finalize(statement_);
        sqlite3_close(db_);
    }
    KeptStatement(const KeptStatement &) = delete;
    KeptStatement &operator=(const KeptStatement &) = delete;

    // Runs it for this text (null for none) and number of rows to skip. Returns the number of rows.
    int Run(const char *text, int offset) {
        if (text != nullptr)
            sqlite3_bind_text(statement_, 1, text, -1, SQLITE_STATIC);
        sqlite3_bind_int(statement_, 2, offset);
        int rows = 0;
        Log log;
        while (sqlite3_step(statement_) == SQLITE_ROW) {
            Read(log);
            TakeRow(log, &rows);
        }
        sqlite3_reset(statement_);
        return rows;
    }
    int Count(const char *text) {
        if (text != nullptr)
            sqlite3_bind_text(statement_, 1, text, -1, SQLITE_STATIC);
        const int count = sqlite3_step(statement_) == SQLITE_ROW ? sqlite3_column_int(statement_, 0) : 0;
        sqlite3_reset(statement_);
        return count;
    }

private:
    // The columns of SELECT *, in the order of the schema.
    void Read(Log &log) {
        log.id = static_cast<uint64_t>(sqlite3_column_int64(statement_, 0));
        int column = 1;
        const auto text = [&] {
            const auto *value = reinterpret_cast<const char *>(sqlite3_column_text(statement_, column++));
            return value != nullptr ? value : "";
        };
        log.host = text();
        log.ip = text();
        log.fac = text();
        log.prio = PriorStrToType(text());
        ++column; // llevel
        log.tag = text();
        log.utcsec = sqlite3_column_int64(statement_, column++);
        log.tzoffset = text();
        log.ldate = text();
        log.ltime = text();
        log.prog = text();
        log.msg = text();
    }

    sqlite3 *db_ = nullptr;
    sqlite3_stmt *statement_ = nullptr;
};

Variant Repeated(const std::string &name, const std::function<void(int call)> &work) {
    return {name, [work] {
                return Time([&] {
                           for (int call = 0; call < kCalls; ++call)
                               work(call);
                       }) /
                       kCalls;
            }};
}

struct Task {
    const char *name;
    const char *host; // null: no filter
    bool isCount;
    const char *sql;
};
constexpr Task kTasks[] = {
    {"newest page", nullptr, false, "SELECT * FROM logs ORDER BY id DESC LIMIT 50 OFFSET ?2"},
    {"page of a host", "host03", false,
     "SELECT * FROM logs WHERE host = ?1 ORDER BY id DESC LIMIT 50 OFFSET ?2"},
    {"number of all", nullptr, true, "SELECT max(rowid) FROM logs"},
    {"number of a host", "host03", true, "SELECT count(*) FROM logs WHERE host = ?1"},
};

bool Measure(const std::string &path, const Task &task) {
    const Conditions conditions =
        task.host == nullptr ? Conditions{} : Conditions{{SYSLOG_ATTRI_HOST, SYSLOG_OP_EQ, task.host, {}}};
    SyslogDBReader reader(path);
    KeptStatement statement(path, task.sql);
    const auto require = [&](bool isGood) {
        if (!isGood)
            Fail(std::string("wrong answer: ") + task.name);
    };
    // Every call asks for another page.
    const auto ours = [&](int call) {
        if (task.isCount)
            return require(reader.SelectCount(conditions, nullptr, nullptr) > 0);
        const _SYSLOG_SQL_LIMIT_tag page{kPageRows, static_cast<uint64_t>(call % 10 * kPageRows)};
        const _SYSLOG_SQL_ORDER_tag newestFirst{0, SYSLOG_ATTRI_ID};
        int rows = 0;
        require(reader.Select(conditions, &page, &newestFirst, TakeRow, &rows, false) == 0 &&
                rows == kPageRows);
    };
    const auto theirs = [&](int call) {
        require(task.isCount ? statement.Count(task.host) > 0
                             : statement.Run(task.host, call % 10 * kPageRows) == kPageRows);
    };
    const auto times = MedianTimes({Repeated("reader", ours), Repeated("sqlite3", theirs)}, kRounds);
    // A count without a filter takes a few microseconds, of which one is the check whether the file has
    // moved.
    return PrintRatio(task.name, times[0], "kept sqlite3", times[1], task.isCount ? 2.5 : 1.5);
}

} // namespace

int main() {
    const std::string path = LogDatabase(kRows);
    PrintHeading("Searches on a kept connection, pages of 50 rows", "ms");
    bool allKept = true;
    for (const Task &task : kTasks)
        allKept = Measure(path, task) && allKept;
    return allKept ? 0 : 1;
}
