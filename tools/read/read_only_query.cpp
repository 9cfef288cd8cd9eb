#include "read/read_only_query.h"

#include <sqlite3.h>
#include <sys/stat.h>

#include <exception>
#include <utility>

#include "base/number_text.h"
#include "keloplatform/kelodb.h"

namespace kelo::tool {
namespace {

struct ResultFreer {
    void operator()(DBResult_tag *result) const { KELODBFreeResult(result); }
};

// The aggregate function that hands rows out.
constexpr const char *kEach = "kelo_each";

struct RowTaker {
    const ReadOnlyQuery::RowHandler &handle;
    std::exception_ptr exception = nullptr;

    static void Take(sqlite3_context *context, int, sqlite3_value **values) {
        auto &taker = *static_cast<RowTaker *>(sqlite3_user_data(context));
        if (taker.exception != nullptr)
            return;
        try {
            taker.handle(ReadOnlyQuery::Values(values));
        } catch (...) {
            taker.exception = std::current_exception();
            sqlite3_result_error(context, "stopped", -1);
        }
    }
    static void End(sqlite3_context *) {}
};

} // namespace

void ReadOnlyQuery::Closer::operator()(DBConnect_tag *connection) const {
    KELODBClose(connection);
}

ReadOnlyQuery::ReadOnlyQuery(LogTable table)
    : table_(std::move(table)), connection_(KELODBConnect(nullptr, nullptr, nullptr, table_.path.c_str())) {
    if (connection_ == nullptr)
        throw DatabaseError(DescribeDatabaseProblem(table_, false, *KELOFailureGet()));
}

ReadOnlyQuery::ReadOnlyQuery(LogTable table, std::chrono::milliseconds timeout)
    : ReadOnlyQuery(std::move(table)) {
    constexpr int kInstructions = 10000; // of SQLite's machine, less than a millisecond
    timeout_ = timeout;
    sqlite3 *db = KELODBInternalDBHdlGet(connection_.get());
    sqlite3_busy_timeout(db, static_cast<int>(timeout.count()));
    sqlite3_progress_handler(db, kInstructions, IsPastDeadline, this);
    struct stat log {};
    // One that is empty, or that the last to close leaves behind, SQLite removes as ever.
    if (stat((table_.path + "-wal").c_str(), &log) == 0 && log.st_size > 0)
        sqlite3_db_config(db, SQLITE_DBCONFIG_NO_CKPT_ON_CLOSE, 1, nullptr);
}

int ReadOnlyQuery::IsPastDeadline(void *database) {
    return std::chrono::steady_clock::now() > static_cast<ReadOnlyQuery *>(database)->deadline_ ? 1 : 0;
}

std::vector<ReadOnlyQuery::Row> ReadOnlyQuery::Rows(const std::string &sql,
                                                    const std::vector<std::string> &columns) const {
    DBResult_tag *raw = nullptr;
    deadline_ = std::chrono::steady_clock::now() + timeout_;
    if (KELODBExecute(connection_.get(), sql.c_str(), &raw) < 0)
        throw SqliteError(table_.path + ": " + KELODBErrorGet(connection_.get()),
                          sqlite3_errcode(KELODBInternalDBHdlGet(connection_.get())) & 0xff, 0);
    const std::unique_ptr<DBResult_tag, ResultFreer> result(raw);
    std::vector<Row> rows;
    for (unsigned int row = 0; result != nullptr && KELODBFetchRow(result.get(), &row) >= 0;) {
        Row &values = rows.emplace_back();
        for (const std::string &column : columns) {
            const char *text = KELODBFetchField(result.get(), row, column.c_str());
            values.emplace_back(text != nullptr ? text : "");
        }
    }
    return rows;
}

std::optional<ReadOnlyQuery::Row> ReadOnlyQuery::FirstRow(const std::string &sql,
                                                          const std::vector<std::string> &columns) const {
    std::vector<Row> rows = Rows(sql, columns);
    return rows.empty() ? std::nullopt : std::optional(std::move(rows.front()));
}

std::vector<std::string> ReadOnlyQuery::Column(const std::string &sql, const std::string &column) const {
    std::vector<std::string> values;
    for (Row &row : Rows(sql, {column}))
        values.push_back(std::move(row.front()));
    return values;
}

void ReadOnlyQuery::ForEach(const std::string &columns, const std::string &from,
                            const RowHandler &handle) const {
    RowTaker taker{handle};
    sqlite3 *db = KELODBInternalDBHdlGet(connection_.get());
    sqlite3_create_function(db, kEach, -1, SQLITE_UTF8, &taker, nullptr, RowTaker::Take, RowTaker::End);
    try {
        Rows(std::string("SELECT ") + kEach + "(" + columns + ") FROM " + from, {});
    } catch (const SqliteError &) {
        if (taker.exception == nullptr)
            throw;
    }
    if (taker.exception != nullptr)
        std::rethrow_exception(taker.exception);
}

std::string_view ReadOnlyQuery::Values::Text(int column) const {
    const auto *text = reinterpret_cast<const char *>(sqlite3_value_text(values_[column]));
    return text == nullptr ? std::string_view() : std::string_view(text);
}

std::optional<int64_t> ReadOnlyQuery::Values::Number(int column) const {
    const int type = sqlite3_value_type(values_[column]);
    return type == SQLITE_INTEGER || type == SQLITE_FLOAT
               ? std::optional(sqlite3_value_int64(values_[column]))
               : std::nullopt;
}

int64_t ReadOnlyQuery::Number(const std::string &sql) const {
    const auto row = FirstRow(sql, {"value"});
    return row ? SignedNumber(row->front()) : 0;
}

void ReadOnlyQuery::RequireTable() const {
    if (Number("SELECT count(*) AS value FROM sqlite_master WHERE lower(name) = '" + table_.name +
               "' AND (type = 'view' OR sql LIKE 'create virtual%')") != 0)
        throw DatabaseError(table_.path + ": '" + table_.name + "' in it is no table");
}

KELODBSkipIndex ReadOnlyQuery::SkipIndex() const {
    KELODBSkipIndex index;
    deadline_ = std::chrono::steady_clock::now() + timeout_;
    if (KELODBSkipIndexGet(connection_.get(), &index) != 0)
        throw SqliteError(table_.path + ": " + KELODBErrorGet(connection_.get()),
                          sqlite3_errcode(KELODBInternalDBHdlGet(connection_.get())) & 0xff, 0);
    return index;
}

bool ReadOnlyQuery::HasTable(const std::string &table) const {
    return Number("SELECT count(*) AS value FROM sqlite_master WHERE type = 'table' AND name = '" + table +
                  "'") != 0;
}

} // namespace kelo::tool
