#include <memory>
#include <new>
#include <optional>
#include <stdexcept>
#include <string>
#include <utility>

#include "common/failure.h"
#include "db/cluster_connection.h"
#include "db/connection.h"
#include "db/distinct_values.h"
#include "db/indexed_search.h"
#include "db/raise_error.h"
#include "db/result.h"
#include "db/row_sink.h"
#include "db/statement.h"

using kelo::platform::PageBounds;
using kelo::platform::RaiseError;
using kelo::platform::RunDistinctValues;
using kelo::platform::RunIndexedSearch;
using kelo::platform::SelectCache;
using kelo::platform::SingleStatement;
using kelo::platform::Statement;

namespace {

// A sink costs a second prepare, which is not worth it for a value or two, or for a page. The number of rows
// is not known in advance, so the first ones are read one by one and then read again.
constexpr size_t kSinkColumns = 3;
constexpr unsigned int kSinkRows = 200;
// Instructions of SQLite's machine up to the first kSinkRows rows: about a millisecond. A statement that
// needs more spends its time on finding or sorting rows, not on their delivery.
constexpr int kCheapSteps = 100000;

enum class Delivery { kByRow, kBySink };

bool StepToEnd(sqlite3_stmt *statement) {
    int status;
    while ((status = sqlite3_step(statement)) == SQLITE_ROW) {
    }
    return status == SQLITE_DONE;
}

// The parameter for the offset of a page whose statement is kept.
constexpr char kOffset[] = ":kelo_offset";

bool IsShort(const PageBounds &page) {
    return page.limit != 0 && page.limit < kSinkRows;
}

void BindOffset(sqlite3_stmt *statement, const PageBounds *page) {
    if (page != nullptr)
        sqlite3_bind_int64(statement, sqlite3_bind_parameter_index(statement, kOffset), page->offset);
}

// Ends the run of a kept statement, and with it its transaction.
class Reset {
public:
    explicit Reset(sqlite3_stmt *statement) : statement_(statement) {}
    ~Reset() { sqlite3_reset(statement_); }
    Reset(const Reset &) = delete;
    Reset &operator=(const Reset &) = delete;

private:
    sqlite3_stmt *statement_;
};

enum class Progress { kDone, kFailed, kMore };

// Takes rows until the result holds `most`.
Progress TakeRows(sqlite3_stmt *statement, DBResult_tag &result, uint64_t most) {
    while (result.rows.Count() < most) {
        const int status = sqlite3_step(statement);
        if (status != SQLITE_ROW)
            return status == SQLITE_DONE ? Progress::kDone : Progress::kFailed;
        result.AddRowOf(statement);
    }
    return Progress::kMore;
}

bool TakeAllRows(sqlite3_stmt *statement, DBResult_tag &result) {
    return TakeRows(statement, result, UINT64_MAX) == Progress::kDone;
}

// True if a restart is cheap and has no side effects.
bool MayBeginAgain(sqlite3_stmt *statement) {
    return sqlite3_stmt_readonly(statement) != 0 && sqlite3_stmt_isexplain(statement) == 0 &&
           sqlite3_stmt_status(statement, SQLITE_STMTSTATUS_VM_STEP, 0) < kCheapSteps;
}

// Runs a prepared statement; `result` is null if its rows are not wanted.
bool Deliver(sqlite3 *db, const SingleStatement &single, Delivery delivery,
             std::unique_ptr<DBResult_tag> &result) {
    sqlite3_stmt *statement = single.prepared.get();
    if (result == nullptr)
        return StepToEnd(statement);
    if (delivery == Delivery::kByRow || result->cells.size() < kSinkColumns ||
        kelo::platform::IsCopied(single.text))
        return TakeAllRows(statement, *result);
    const Progress progress = TakeRows(statement, *result, kSinkRows);
    if (progress != Progress::kMore)
        return progress == Progress::kDone;
    if (!MayBeginAgain(statement))
        return TakeAllRows(statement, *result);
    // The sink can be registered only while no statement runs.
    sqlite3_reset(statement);
    result->rows = {};
    const Statement sink = kelo::platform::PrepareRowSink(db, single, *result);
    return sink != nullptr ? StepToEnd(sink.get()) : TakeAllRows(statement, *result);
}

using Rows = std::unique_ptr<DBResult_tag>;

// The number of times that SQLite has compiled a statement again.
int CompilationsOf(sqlite3_stmt *statement) {
    return sqlite3_stmt_status(statement, SQLITE_STMTSTATUS_REPREPARE, 0);
}

// Runs the statement that the connection keeps for the key, row by row; nothing if there is none of use.
std::optional<bool> RunKept(DBConnect_tag &connection, const SelectCache::Key &key, const PageBounds *page,
                            Rows &rows) {
    sqlite3_stmt *statement = connection.selects.Find(key);
    if (statement == nullptr)
        return std::nullopt;
    BindOffset(statement, page);
    const int compilations = CompilationsOf(statement);
    const Reset reset(statement);
    rows = std::make_unique<DBResult_tag>(statement);
    const Progress progress = TakeRows(statement, *rows, page != nullptr ? UINT64_MAX : kSinkRows);
    if (progress == Progress::kFailed)
        return false;
    if (progress == Progress::kDone && CompilationsOf(statement) == compilations)
        return true;
    // The table has other columns now, or there are too many rows for this way.
    rows.reset();
    return std::nullopt;
}

// Runs the one statement of `sql`; `rows` stays null if it has no columns or they are not wanted. The
// statement is left in `single`.
bool RunSingle(sqlite3 *db, const char *sql, Delivery delivery, const PageBounds *page, bool wantsRows,
               SingleStatement &single, Rows &rows) {
    if (!PrepareSingle(db, sql, single))
        return false;
    if (single.prepared == nullptr)
        return true;
    BindOffset(single.prepared.get(), page);
    if (wantsRows && sqlite3_column_count(single.prepared.get()) > 0)
        rows = std::make_unique<DBResult_tag>(single.prepared.get());
    return Deliver(db, single, delivery, rows);
}

// Hands the rows of a statement that succeeded to the caller.
bool HandOver(DBConnect_tag &connection, std::unique_ptr<DBResult_tag> rows, DBResult_tag **result) {
    // The error is raised after the last statement is finalised: finalising a successful one would clear it.
    if (connection.file.HasChanged()) {
        RaiseError(connection.db, SQLITE_BUSY, "database changed while it was read without locks");
        return false;
    }
    if (result != nullptr)
        *result = rows.release();
    return true;
}

// Runs `sql`, which stands for the key, and keeps it where it can be used again.
bool RunAndKeep(DBConnect_tag &connection, const char *sql, const SelectCache::Key &key,
                const PageBounds *page, Delivery delivery, DBResult_tag **result) {
    Rows rows;
    {
        SingleStatement single;
        if (!RunSingle(connection.db, sql, delivery, page, result != nullptr, single, rows))
            return false;
        if (rows != nullptr && rows->rows.Count() <= kSinkRows)
            connection.selects.Keep(key, std::move(single.prepared));
    }
    return HandOver(connection, std::move(rows), result);
}

// Runs a statement in another way than SQLite would, with the same result; nothing if none is known.
std::optional<bool> RunInOtherWay(sqlite3 *db, const char *sql, const PageBounds *page, bool wantsRows,
                                  Rows &rows) {
    const auto isFound = RunIndexedSearch(db, sql, page, wantsRows, rows);
    return isFound || !wantsRows ? isFound : RunDistinctValues(db, sql, page, rows);
}

bool Run(DBConnect_tag &connection, const char *sql, Delivery delivery, DBResult_tag **result) {
    if (connection.cluster != nullptr)
        return kelo::platform::RunOnCluster(connection, sql, nullptr, result);
    if (const std::optional<bool> isInserted = connection.inserts.Run(connection.db, sql))
        return *isInserted;
    Rows rows;
    if (const auto isFound = RunInOtherWay(connection.db, sql, nullptr, result != nullptr, rows))
        return *isFound && HandOver(connection, std::move(rows), result);
    const SelectCache::Key key{sql, SelectCache::kNoLimit};
    if (result != nullptr) {
        if (const auto isDone = RunKept(connection, key, nullptr, rows))
            return *isDone && HandOver(connection, std::move(rows), result);
    }
    return RunAndKeep(connection, sql, key, nullptr, delivery, result);
}

// The one SELECT of `sql` with its bounds, "" if the text has no statement. The limit is a part of the text,
// because it helps SQLite to choose a plan.
bool BoundedText(sqlite3 *db, const char *sql, const PageBounds &page, std::string &bounded) {
    SingleStatement single;
    if (!PrepareSingle(db, sql, single))
        return false;
    if (single.prepared == nullptr)
        return true;
    if (sqlite3_stmt_readonly(single.prepared.get()) == 0) {
        single.prepared.reset();
        RaiseError(db, SQLITE_ERROR, "only a SELECT can be limited");
        return false;
    }
    bounded.append(single.text).append(kelo::platform::kCommentEnd).append("LIMIT ");
    bounded.append(page.limit != 0 ? std::to_string(page.limit) : "-1").append(" OFFSET ");
    bounded.append(IsShort(page) ? kOffset : std::to_string(page.offset));
    return true;
}

bool RunPage(DBConnect_tag &connection, const char *sql, const PageBounds &page, DBResult_tag **result) {
    if (connection.cluster != nullptr)
        return kelo::platform::RunOnCluster(connection, sql, &page, result);
    Rows rows;
    if (const auto isFound = RunInOtherWay(connection.db, sql, &page, result != nullptr, rows))
        return *isFound && HandOver(connection, std::move(rows), result);
    const SelectCache::Key key{sql, page.limit};
    if (result != nullptr && IsShort(page)) {
        if (const auto isDone = RunKept(connection, key, &page, rows))
            return *isDone && HandOver(connection, std::move(rows), result);
    }
    std::string bounded;
    if (!BoundedText(connection.db, sql, page, bounded))
        return false;
    if (IsShort(page))
        return RunAndKeep(connection, bounded.c_str(), key, &page, Delivery::kByRow, result);
    return Run(connection, bounded.c_str(), Delivery::kBySink, result);
}

// Runs `work` for a statement of the caller and converts its outcome to the result code. On failure the
// connection's error is set.
template <typename Work>
int Guarded(DBConnect_tag *connection, const char *sql, DBResult_tag **result, Work work) {
    if (result != nullptr)
        *result = nullptr;
    if (connection == nullptr)
        return kelo::platform::Fail(KELO_FAILURE_ARGUMENT, sql != nullptr ? sql : "", "", "not connected");
    try {
        if (sql != nullptr && work())
            return 0;
        if (sql == nullptr)
            RaiseError(connection->db, SQLITE_MISUSE, "no statement text");
    } catch (const std::bad_alloc &) {
        RaiseError(connection->db, SQLITE_NOMEM, "out of memory");
    } catch (const std::length_error &) {
        RaiseError(connection->db, SQLITE_TOOBIG, "result too big");
    }
    return kelo::platform::FailStatement(connection->db, sql != nullptr ? sql : "");
}

} // namespace

int KELODBExecute(DBConnect_tag *connection, const char *sql, DBResult_tag **result) {
    return Guarded(connection, sql, result, [&] { return Run(*connection, sql, Delivery::kBySink, result); });
}

int KELODBSelectLimit(DBConnect_tag *connection, const char *sql, unsigned int limit, unsigned int offset,
                      DBResult_tag **result) {
    return Guarded(connection, sql, result, [&] {
        return RunPage(*connection, sql, {limit, offset}, result);
    });
}
