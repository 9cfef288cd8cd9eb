#include "db/indexed_search.h"

#include <charconv>
#include <limits>
#include <string>
#include <utility>
#include <vector>

#include "db/other_way.h"
#include "db/statement.h"
#include "skip_index/search_plan.h"

namespace kelo::platform {
namespace {

using Kind = SearchText::Kind;
using Order = SearchText::Order;

// More rows are deleted by the statement as it is.
constexpr size_t kMostDeleted = 50'000;

// A statement over ranges of ids: ?1 and ?2 are the range, ?3 the most rows.
class RangeStatement {
public:
    RangeStatement(sqlite3 *db, const std::string &head, const SearchText &text) {
        std::string sql = head + " NOT INDEXED WHERE id BETWEEN ?1 AND ?2 AND " + AllConditions(text);
        if (text.kind != Kind::kCount)
            sql += text.order == Order::kDescending ? " ORDER BY id DESC LIMIT ?3" : " ORDER BY id LIMIT ?3";
        sqlite3_stmt *statement = nullptr;
        sqlite3_prepare_v2(db, sql.c_str(), static_cast<int>(sql.size()) + 1, &statement, nullptr);
        statement_.reset(statement);
    }

    sqlite3_stmt *Get() const { return statement_.get(); }

    // Runs it and calls `take` for each row. False on failure.
    template <typename Take>
    bool Run(const IdRange &range, int64_t most, Take take) {
        sqlite3_stmt *statement = Get();
        sqlite3_bind_int64(statement, 1, range.first);
        sqlite3_bind_int64(statement, 2, range.last);
        if (sqlite3_bind_parameter_count(statement) > 2)
            sqlite3_bind_int64(statement, 3, most);
        int status;
        while ((status = sqlite3_step(statement)) == SQLITE_ROW)
            take(statement);
        sqlite3_reset(statement);
        return status == SQLITE_DONE;
    }

private:
    Statement statement_;
};

constexpr int64_t kAllRows = std::numeric_limits<int64_t>::max();

// Runs the statement over all ranges, up to `most` rows.
template <typename Take>
bool RunOver(SearchPlan &plan, RangeStatement &statement, int64_t most, Take take) {
    int64_t taken = 0;
    const auto counted = [&](sqlite3_stmt *row) {
        ++taken;
        take(row);
    };
    std::vector<IdRange> ranges;
    while (taken < most && plan.Next(ranges)) {
        for (const IdRange &range : ranges) {
            if (taken == most)
                return true;
            if (!statement.Run(range, most - taken, counted))
                return false;
        }
    }
    return true;
}

bool Select(sqlite3 *db, SearchPlan &plan, const PageBounds &page, std::unique_ptr<DBResult_tag> &rows) {
    RangeStatement statement(db, std::string(plan.Text().head), plan.Text());
    if (statement.Get() == nullptr)
        return false;
    rows = std::make_unique<DBResult_tag>(statement.Get());
    const int64_t most = page.limit != 0 ? int64_t{page.limit} + page.offset : kAllRows;
    unsigned int skipped = 0;
    return RunOver(plan, statement, most, [&](sqlite3_stmt *row) {
        if (skipped < page.offset)
            ++skipped;
        else
            rows->AddRowOf(row);
    });
}

bool Count(sqlite3 *db, SearchPlan &plan, std::unique_ptr<DBResult_tag> &rows) {
    RangeStatement statement(db, std::string(plan.Text().head), plan.Text());
    if (statement.Get() == nullptr)
        return false;
    rows = std::make_unique<DBResult_tag>(statement.Get());
    int64_t count = 0;
    const auto add = [&](sqlite3_stmt *row) { count += sqlite3_column_int64(row, 0); };
    if (!RunOver(plan, statement, kAllRows, add))
        return false;
    const std::string text = std::to_string(count);
    rows->cells[0] = {text.c_str(), text.size()};
    rows->AddRow();
    return true;
}

// Finds the rows first, and then deletes them by one statement, as without the index.
bool Delete(sqlite3 *db, SearchPlan &plan) {
    RangeStatement statement(db, "SELECT id FROM logs", plan.Text());
    if (statement.Get() == nullptr)
        return false;
    std::string sql = "DELETE FROM logs WHERE id IN (";
    size_t count = 0;
    const auto add = [&](sqlite3_stmt *row) {
        sql += (count++ == 0 ? "" : ",") + std::to_string(sqlite3_column_int64(row, 0));
    };
    return RunOver(plan, statement, kMostDeleted + 1, add) && count <= kMostDeleted &&
           sqlite3_exec(db, (sql + ")").c_str(), nullptr, nullptr, nullptr) == SQLITE_OK;
}

bool RunPlan(sqlite3 *db, SearchPlan &plan, const PageBounds &page, std::unique_ptr<DBResult_tag> &rows) {
    switch (plan.Text().kind) {
    case Kind::kSelect:
        return Select(db, plan, page, rows);
    case Kind::kCount:
        return Count(db, plan, rows);
    case Kind::kDelete:
        break;
    }
    return Delete(db, plan);
}

} // namespace

std::optional<bool> RunIndexedSearch(sqlite3 *db, const char *sql, const PageBounds *page, bool wantsRows,
                                     std::unique_ptr<DBResult_tag> &rows) {
    auto plan = SearchPlan::Read(db, sql);
    if (!plan)
        return std::nullopt;
    const bool isDeletion = plan->Text().kind == Kind::kDelete;
    const bool fits = page != nullptr ? plan->Text().kind == Kind::kSelect : isDeletion || wantsRows;
    if (!fits)
        return std::nullopt;
    const int64_t pageRows = page != nullptr && page->limit != 0 ? int64_t{page->limit} + page->offset : 0;
    return AnswerInOtherWay(
        db, isDeletion ? Access::kWrite : Access::kRead, [&] { return plan->IsWorthwhile(pageRows); },
        [&] {
            return RunPlan(db, *plan, page != nullptr ? *page : PageBounds{0, 0}, rows);
        },
        rows);
}

} // namespace kelo::platform
