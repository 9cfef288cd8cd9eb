// Every row of a large log through SyslogDBSelect, against a plain SQLite loop that fills the same record: by
// one thread, and by two, each with the rows of one half of the ids.

#include <sqlite3.h>
#include <sys/mman.h>

#include <cstdio>
#include <cstdlib>
#include <future>
#include <list>
#include <memory>
#include <string>
#include <vector>

#include "kelosyslog/dbutil.h"
#include "support/log_database.h"
#include "support/measure.h"
#include "support/memory.h"

using namespace kelo::bench;

namespace {

constexpr int kRows = 1000000;
constexpr int kRounds = 9;

struct Total {
    size_t rows = 0;
    size_t bytes = 0;
};

int AddRow(_SYSLOG_LOG_DATA_tag &log, void *context) {
    auto *total = static_cast<Total *>(context);
    ++total->rows;
    total->bytes += log.msg.size();
    return 0;
}

Total SelectAll(const std::string &path) {
    Total total;
    if (SyslogDBSelect(path, {}, nullptr, nullptr, AddRow, &total, false) != 0)
        Fail("SyslogDBSelect failed on " + path);
    return total;
}

// What a caller with two processors does who need not have all rows in one state of the database.
Total SelectByTwoThreads(const std::string &path) {
    const auto selectHalf = [&](_SYSLOG_SQL_OP_tag op) {
        Total total;
        const std::list<_SYSLOG_SQL_COND_tag> half = {{SYSLOG_ATTRI_ID, op, std::to_string(kRows / 2), {}}};
        if (SyslogDBSelect(path, half, nullptr, nullptr, AddRow, &total, false) != 0)
            Fail("SyslogDBSelect failed on " + path);
        return total;
    };
    std::future<Total> newer = std::async(std::launch::async, selectHalf, SYSLOG_OP_GT);
    const Total older = selectHalf(SYSLOG_OP_LE);
    const Total rest = newer.get();
    return {older.rows + rest.rows, older.bytes + rest.bytes};
}

// Columns by position, as a caller writes who knows his table.
Total LoopOverAll(const std::string &path) {
    sqlite3 *db = nullptr;
    sqlite3_stmt *statement = nullptr;
    if (sqlite3_open_v2(path.c_str(), &db, SQLITE_OPEN_READWRITE, nullptr) != SQLITE_OK ||
        sqlite3_prepare_v2(db, "SELECT * FROM logs", -1, &statement, nullptr) != SQLITE_OK)
        Fail(path + ": " + sqlite3_errmsg(db));
    const auto text = [&](int column) {
        const auto *value = reinterpret_cast<const char *>(sqlite3_column_text(statement, column));
        return value != nullptr ? value : "";
    };
    Total total;
    _SYSLOG_LOG_DATA_tag log;
    while (sqlite3_step(statement) == SQLITE_ROW) {
        log.id = static_cast<uint64_t>(sqlite3_column_int64(statement, 0));
        log.host = text(1);
        log.ip = text(2);
        log.fac = text(3);
        log.prio = PriorStrToType(text(4));
        log.tag = text(6);
        log.utcsec = sqlite3_column_int64(statement, 7);
        log.tzoffset = text(8);
        log.ldate = text(9);
        log.ltime = text(10);
        log.prog = text(11);
        log.msg = text(12);
        AddRow(log, &total);
    }
    sqlite3_finalize(statement);
    sqlite3_close(db);
    return total;
}

// Takes as much new memory as the result of SyslogDBSelect, in the same pieces, and writes to each page: what
// the system takes for it.
void TouchMemory(size_t bytes) {
    constexpr size_t kPiece = size_t{2} << 20;
    constexpr size_t kPage = 4096;
    std::vector<std::unique_ptr<char, decltype(&std::free)>> pieces;
    for (size_t taken = 0; taken < bytes; taken += kPiece) {
        pieces.emplace_back(static_cast<char *>(std::aligned_alloc(kPiece, kPiece)), &std::free);
        char *piece = pieces.back().get();
        if (piece == nullptr)
            Fail("no memory");
        madvise(piece, kPiece, MADV_HUGEPAGE);
        for (size_t at = 0; at < kPiece; at += kPage)
            static_cast<volatile char *>(piece)[at] = 1;
    }
}

// Bytes of the texts of all cells, without their NULs.
double ResultBytes(const std::string &path) {
    sqlite3 *db = nullptr;
    double bytes = 0;
    const auto add = [](void *sum, int, char **values, char **) {
        *static_cast<double *>(sum) = std::stod(values[0]);
        return 0;
    };
    if (sqlite3_open_v2(path.c_str(), &db, SQLITE_OPEN_READWRITE, nullptr) != SQLITE_OK ||
        sqlite3_exec(
            db,
            "SELECT sum(length(CAST(id || host || ip || fac || prio || llevel || tag || utcsec || tzoffset ||"
            " ldate || ltime || prog || msg AS BLOB))) FROM logs",
            add, &bytes, nullptr) != SQLITE_OK)
        Fail(path + ": " + sqlite3_errmsg(db));
    sqlite3_close(db);
    return bytes;
}

} // namespace

int main() {
    const std::string path = LogDatabase(kRows);
    constexpr double kMiB = 1024 * 1024;

    const double bytes = ResultBytes(path);
    const size_t peakBytes = PeakMemoryOf([&] { SelectAll(path); });
    const auto peak = static_cast<double>(peakBytes);
    PrintHeading("Reading all of " + std::to_string(kRows) + " rows: peak memory", "MiB");
    bool allKept = PrintRatio("SyslogDBSelect", peak / kMiB, "texts of the result", bytes / kMiB, 1.5);

    Total selected;
    Total divided;
    Total looped;
    const auto times =
        MedianTimes({{"select", [&] { return Time([&] { selected = SelectAll(path); }); }},
                     {"threads", [&] { return Time([&] { divided = SelectByTwoThreads(path); }); }},
                     {"memory", [&] { return Time([&] { TouchMemory(peakBytes); }); }},
                     {"loop", [&] { return Time([&] { looped = LoopOverAll(path); }); }}},
                    kRounds);
    for (const Total &total : {selected, divided}) {
        if (total.rows != kRows || total.bytes != looped.bytes)
            Fail("SyslogDBSelect and the loop read different rows");
    }
    PrintHeading("Reading all of " + std::to_string(kRows) + " rows: time", "ms");
    allKept = PrintRatio("SyslogDBSelect", times[0], "sqlite3_step loop", times[3], 1.1) && allKept;
    allKept =
        PrintRatio("SyslogDBSelect of halves by two threads", times[1], "loop", times[3], 0.85) && allKept;
    // The loop has one row at a time; a result is complete before its first row is passed on.
    PrintHeading("The same without the first touch of " + std::to_string(peakBytes >> 20) + " MiB of memory",
                 "ms");
    allKept =
        PrintRatio("SyslogDBSelect", times[0] - times[2], "sqlite3_step loop", times[3], 1.1) && allKept;
    return allKept ? 0 : 1;
}
