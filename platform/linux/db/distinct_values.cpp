#include "db/distinct_values.h"

#include <cstring>
#include <string>
#include <string_view>

#include "db/other_way.h"
#include "db/statement.h"
#include "skip_index/database_state.h"
#include "skip_index/skip_index.h"
#include "skip_index/sql_tokens.h"

namespace kelo::platform {
namespace {

// Rows of one value that are read before the next value is searched for.
constexpr int kRowsBeforeJump = 32;

struct FreeValue {
    void operator()(sqlite3_value *value) const { sqlite3_value_free(value); }
};
using Value = std::unique_ptr<sqlite3_value, FreeValue>;

// The column of "SELECT host FROM logs GROUP BY host ORDER BY host asc" or "SELECT DISTINCT host FROM logs";
// "" for any other text.
std::string ColumnOf(std::string_view sql) {
    if (!sql.starts_with("SELECT ") || sql.size() > 200)
        return "";
    const auto tokens = ReadSqlTokens(sql);
    if (!tokens)
        return "";
    std::string form;
    for (const SqlToken &token : *tokens)
        form.append(token.text).append(" ");
    const std::string column(tokens->size() == 5  ? (*tokens)[2].text
                             : tokens->size() > 5 ? (*tokens)[1].text
                                                  : "");
    const bool isOne =
        form == "SELECT DISTINCT " + column + " FROM logs " ||
        form == "SELECT " + column + " FROM logs GROUP BY " + column + " ORDER BY " + column + " asc ";
    return isOne ? column : "";
}

std::string_view TextAt(const Query &query, int column) {
    const auto *text = reinterpret_cast<const char *>(sqlite3_column_text(query.Get(), column));
    return text != nullptr ? text : "";
}

// The index in whose order SQLite gives the rows of the statement as it is, without a sort; "" for none.
std::string IndexOf(sqlite3 *db, const char *sql) {
    constexpr std::string_view kScan = "SCAN logs USING COVERING INDEX ";
    Query plan(db, std::string("EXPLAIN QUERY PLAN ") + sql);
    if (!plan.Step() || !TextAt(plan, 3).starts_with(kScan))
        return "";
    std::string index(TextAt(plan, 3).substr(kScan.size()));
    return plan.Step() ? "" : index;
}

// Whether equal values of the column are the same bytes, and the index has them in ascending order.
bool IsPlain(sqlite3 *db, const std::string &index, const std::string &column) {
    const char *type = nullptr;
    if (sqlite3_table_column_metadata(db, "main", "logs", column.c_str(), &type, nullptr, nullptr, nullptr,
                                      nullptr) != SQLITE_OK ||
        sqlite3_table_column_metadata(db, "temp", "logs", nullptr, nullptr, nullptr, nullptr, nullptr,
                                      nullptr) == SQLITE_OK)
        return false;
    if (sqlite3_stricmp(type, "TEXT") != 0 && sqlite3_stricmp(type, "INTEGER") != 0)
        return false;
    Query query(db, "SELECT name, \"desc\", coll FROM pragma_index_xinfo(?1, 'main') WHERE seqno = 0");
    sqlite3_bind_text(query.Get(), 1, index.c_str(), -1, SQLITE_STATIC);
    return query.Step() && sqlite3_stricmp(std::string(TextAt(query, 0)).c_str(), column.c_str()) == 0 &&
           sqlite3_column_int(query.Get(), 1) == 0 && TextAt(query, 2) == "BINARY";
}

// Whether the row has this value in its only column.
bool HasValue(sqlite3_stmt *row, sqlite3_value *value) {
    const int type = sqlite3_column_type(row, 0);
    if (type != sqlite3_value_type(value))
        return false;
    if (type == SQLITE_INTEGER)
        return sqlite3_column_int64(row, 0) == sqlite3_value_int64(value);
    if (type == SQLITE_FLOAT)
        return sqlite3_column_double(row, 0) == sqlite3_value_double(value);
    const int size = sqlite3_column_bytes(row, 0);
    return size == sqlite3_value_bytes(value) &&
           (size == 0 || std::memcmp(sqlite3_column_blob(row, 0), sqlite3_value_blob(value),
                                     static_cast<size_t>(size)) == 0);
}

// Collects the values, each once.
class Values {
public:
    Values(sqlite3 *db, const std::string &column, const PageBounds *page,
           std::unique_ptr<DBResult_tag> &rows)
        : all_(db,
               "SELECT " + column + " FROM main.logs WHERE " + column + " IS NOT NULL ORDER BY " + column),
          null_(db, "SELECT " + column + " FROM main.logs WHERE " + column + " IS NULL LIMIT 1"),
          greater_(db, "SELECT " + column + " FROM main.logs WHERE " + column + " > ?1 ORDER BY " + column),
          skip_(page != nullptr ? page->offset : 0), limit_(page != nullptr ? page->limit : 0), rows_(rows) {}

    // False on failure.
    bool Collect() {
        if (all_.Get() == nullptr || null_.Get() == nullptr || greater_.Get() == nullptr)
            return false;
        rows_ = std::make_unique<DBResult_tag>(all_.Get());
        if (null_.Step())
            Take(null_);
        Query *query = &all_;
        int repetitions = 0;
        while (!IsFull() && query->Step()) {
            if (last_ == nullptr || !HasValue(query->Get(), last_.get())) {
                // Before the row is taken, which makes a text of a BLOB.
                last_.reset(sqlite3_value_dup(sqlite3_column_value(query->Get(), 0)));
                if (last_ == nullptr)
                    return false;
                Take(*query);
                repetitions = 0;
            } else if (++repetitions == kRowsBeforeJump) {
                query = &greater_;
                query->Reset();
                sqlite3_bind_value(query->Get(), 1, last_.get());
            }
        }
        return IsFull() || query->Status() == SQLITE_DONE;
    }

private:
    bool IsFull() const { return limit_ != 0 && rows_->rows.Count() >= limit_; }
    void Take(const Query &query) {
        if (skip_ > 0)
            --skip_;
        else if (!IsFull())
            rows_->AddRowOf(query.Get());
    }

    Query all_;
    Query null_;
    Query greater_;
    unsigned int skip_;
    unsigned int limit_;
    std::unique_ptr<DBResult_tag> &rows_;
    Value last_;
};

} // namespace

std::optional<bool> RunDistinctValues(sqlite3 *db, const char *sql, const PageBounds *page,
                                      std::unique_ptr<DBResult_tag> &rows) {
    const std::string column = ColumnOf(sql);
    if (column.empty() || IsSwitchedOff() || sqlite3_get_autocommit(db) == 0 ||
        sqlite3_txn_state(db, "main") != SQLITE_TXN_NONE)
        return std::nullopt;
    const auto isPossible = [&] {
        const std::string index = IndexOf(db, sql);
        return !index.empty() && IsPlain(db, index, column);
    };
    return AnswerInOtherWay(
        db, Access::kRead, isPossible, [&] { return Values(db, column, page, rows).Collect(); }, rows);
}

} // namespace kelo::platform
