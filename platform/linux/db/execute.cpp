#include <memory>
#include <new>
#include <optional>
#include <stdexcept>
#include <string>
#include <utility>

#include "common/failure.h"
#include "db/connection.h"
#include "db/indexed_search.h"
#include "db/raise_error.h"
#include "db/result.h"
#include "db/row_sink.h"
#include "db/statement.h"

using kelo::platform::PageBounds;
using kelo::platform::RaiseError;
using kelo::platform::RunIndexedSearch;
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
    if (delivery == Delivery::kByRow || result->cells.size() < kSinkColumns)
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

// Runs the one statement of `sql`; `rows` stays null if it has no columns or they are not wanted.
bool RunSingle(sqlite3 *db, const char *sql, Delivery delivery, bool wantsRows,
               std::unique_ptr<DBResult_tag> &rows) {
    SingleStatement single;
    if (!PrepareSingle(db, sql, single))
        return false;
    if (single.prepared == nullptr)
        return true;
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

bool Run(DBConnect_tag &connection, const char *sql, Delivery delivery, DBResult_tag **result) {
    if (const std::optional<bool> isInserted = connection.inserts.Run(connection.db, sql))
        return *isInserted;
    std::unique_ptr<DBResult_tag> rows;
    const std::optional<bool> isFound =
        RunIndexedSearch(connection.db, sql, nullptr, result != nullptr, rows);
    const bool isDone = isFound ? *isFound : RunSingle(connection.db, sql, delivery, result != nullptr, rows);
    return isDone && HandOver(connection, std::move(rows), result);
}

// The one SELECT of `sql` with its bounds, "" if the text has no statement.
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
    bounded.append(page.limit != 0 ? std::to_string(page.limit) : "-1")
        .append(" OFFSET ")
        .append(std::to_string(page.offset));
    return true;
}

bool RunPage(DBConnect_tag &connection, const char *sql, const PageBounds &page, DBResult_tag **result) {
    std::unique_ptr<DBResult_tag> rows;
    if (const auto isFound = RunIndexedSearch(connection.db, sql, &page, result != nullptr, rows))
        return *isFound && HandOver(connection, std::move(rows), result);
    std::string bounded;
    const bool isShort = page.limit != 0 && page.limit < kSinkRows;
    return BoundedText(connection.db, sql, page, bounded) &&
           Run(connection, bounded.c_str(), isShort ? Delivery::kByRow : Delivery::kBySink, result);
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
