#include "skip_index/search_plan.h"

#include <algorithm>
#include <utility>

namespace kelo::platform {
namespace {

// Fewer ids are read faster than anything is decided.
constexpr int64_t kFewIds = 4096;
// A page of a common word is found among the newest ids, without the index.
constexpr int64_t kWindowIds = 1024;
// More rows are not looked up one by one where SQLite has an index for other conditions.
constexpr int64_t kManyIds = 100'000;

int64_t SpanOf(const IdRange &ids) {
    return CountIds({ids}, std::numeric_limits<int64_t>::max());
}

} // namespace

std::optional<SearchPlan> SearchPlan::Read(sqlite3 *db, std::string_view sql) {
    auto text = ReadSearchText(sql);
    if (!text || sqlite3_get_autocommit(db) == 0 || sqlite3_txn_state(db, "main") != SQLITE_TXN_NONE)
        return std::nullopt;
    auto index = SkipIndex::Open(db);
    if (!index || text->ids.first >= index->Header().EndId())
        return std::nullopt;
    return SearchPlan(db, sql, std::move(*text), std::move(*index));
}

// Narrows the ids to those that the table has. False if there are few.
bool SearchPlan::BoundIds() {
    Query ends(db_, "SELECT (SELECT min(id) FROM main.logs), (SELECT max(id) FROM main.logs)");
    if (!ends.Step() || sqlite3_column_type(ends.Get(), 0) != SQLITE_INTEGER)
        return false;
    text_.ids.first = std::max<int64_t>(text_.ids.first, sqlite3_column_int64(ends.Get(), 0));
    text_.ids.last = std::min<int64_t>(text_.ids.last, sqlite3_column_int64(ends.Get(), 1));
    return text_.ids.first <= text_.ids.last && SpanOf(text_.ids) > kFewIds;
}

// Whether SQLite would read the statement's rows one after the other; otherwise the first column that it uses
// an index of.
bool SearchPlan::IsScan(std::string &column) const {
    if (text_.isTextOnly)
        return true;
    Query plan(db_, "EXPLAIN QUERY PLAN " + std::string(sql_));
    while (plan.Step()) {
        const auto *bytes = reinterpret_cast<const char *>(sqlite3_column_text(plan.Get(), 3));
        const std::string_view detail(bytes != nullptr ? bytes : "");
        if (detail == "SCAN logs" || detail.find("INTEGER PRIMARY KEY") != std::string_view::npos)
            return true;
        const size_t bracket = detail.find('(');
        if (bracket == std::string_view::npos)
            continue;
        const std::string_view rest = detail.substr(bracket + 1);
        column = rest.substr(0, rest.find_first_of("=<> "));
        return false;
    }
    return false;
}

// Whether at least `count` rows meet the conditions on one column, which has an index.
bool SearchPlan::HasManyRows(const std::string &column, int64_t count) const {
    const std::string conditions = ConditionsOn(text_, column);
    if (conditions.empty())
        return false;
    Query rows(db_, "SELECT count(*) FROM (SELECT 1 FROM main.logs WHERE " + conditions + " LIMIT ?1)");
    rows.Bind(1, count);
    return rows.Step() && sqlite3_column_int64(rows.Get(), 0) >= count;
}

bool SearchPlan::CollectAll() {
    if (!index_.Fits(db_))
        return false;
    Candidates candidates(index_.File(), index_.Header(), text_.need, text_.ids);
    while (candidates.Next(IsAscending(), all_)) {
    }
    if (!candidates.IsGood())
        index_.Discard();
    return candidates.IsGood();
}

bool SearchPlan::IsWorthwhile(bool isPage) {
    if (!BoundIds())
        return false;
    std::string column;
    const bool isScan = IsScan(column);
    if (isScan && isPage)
        return isByStep_ = true;
    if (!isScan && text_.kind == SearchText::Kind::kSelect && text_.order == SearchText::Order::kNone)
        return false;
    if (!isScan && !HasManyRows(column, kIdsPerBlock * 16))
        return false;
    if (!CollectAll())
        return false;
    const int64_t count = CountIds(all_, std::numeric_limits<int64_t>::max());
    return isScan ? count <= SpanOf(text_.ids) / 2 : count <= kManyIds && HasManyRows(column, count);
}

// Takes the ids that a page is likely to be in off the range.
IdRange SearchPlan::TakeWindow() {
    IdRange window = text_.ids;
    if (IsAscending()) {
        window.last = window.first + kWindowIds - 1;
        text_.ids.first = window.last + 1;
    } else {
        window.first = window.last - kWindowIds + 1;
        text_.ids.last = window.first - 1;
    }
    return window;
}

bool SearchPlan::Next(std::vector<IdRange> &ranges) {
    ranges.clear();
    if (!isByStep_) {
        ranges.swap(all_);
        return !ranges.empty();
    }
    if (step_ == Step::kWindow) {
        ranges.push_back(TakeWindow());
        step_ = Step::kOpen;
        return true;
    }
    if (step_ == Step::kOpen) {
        const bool isUsable = index_.Fits(db_);
        step_ = isUsable ? Step::kCandidates : Step::kDone;
        if (!isUsable) {
            ranges.push_back(text_.ids);
            return true;
        }
        candidates_.emplace(index_.File(), index_.Header(), text_.need, text_.ids);
    }
    if (step_ == Step::kDone || !candidates_->Next(IsAscending(), ranges))
        return false;
    if (!candidates_->IsGood()) {
        index_.Discard();
        // What was not handed out yet.
        ranges.assign(1, candidates_->Rest(IsAscending()));
        step_ = Step::kDone;
    }
    return true;
}

} // namespace kelo::platform
