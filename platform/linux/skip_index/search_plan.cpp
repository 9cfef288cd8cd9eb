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
// Fewer rows are quickly found by an index of SQLite, and sorted.
constexpr int64_t kFewRows = 512;
// Ids for each row of a range of times: with more, it is better to read only the rows.
constexpr int64_t kMostGaps = 3;

int64_t SpanOf(const IdRange &ids) {
    return CountIds({ids}, std::numeric_limits<int64_t>::max());
}

} // namespace

std::optional<SearchPlan> SearchPlan::Read(sqlite3 *db, std::string_view sql) {
    auto text = ReadSearchText(sql);
    if (!text || IsSwitchedOff() || sqlite3_get_autocommit(db) == 0 ||
        sqlite3_txn_state(db, "main") != SQLITE_TXN_NONE)
        return std::nullopt;
    // Without the need of bits only a page may be found faster.
    const bool isOrdered = text->kind == SearchText::Kind::kSelect && text->order != SearchText::Order::kNone;
    if (!text->needsBits && !isOrdered)
        return std::nullopt;
    std::optional<SkipIndex> index;
    if (text->need.kind != Need::Kind::kNothing)
        index = SkipIndex::Open(db);
    if (index && text->ids.first >= index->Header().EndId())
        index.reset();
    if (!index && (text->times.empty() || !isOrdered))
        return std::nullopt;
    return SearchPlan(db, sql, std::move(*text), std::move(index));
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

// How SQLite would find the rows of the statement as it is.
SearchPlan::Access SearchPlan::AccessOfStatement(int64_t pageRows) const {
    Access access;
    // Without an order the rows come in that of an index of messages, should there be one.
    if (text_.isTextOnly && !IsUnordered())
        return {true, false, ""};
    const std::string limit = pageRows != 0 ? " LIMIT " + std::to_string(pageRows) : "";
    Query plan(db_, "EXPLAIN QUERY PLAN " + std::string(sql_) + limit);
    while (plan.Step()) {
        const auto *bytes = reinterpret_cast<const char *>(sqlite3_column_text(plan.Get(), 3));
        const std::string_view detail(bytes != nullptr ? bytes : "");
        if (detail == "SCAN logs" || detail.find("INTEGER PRIMARY KEY") != std::string_view::npos)
            access.isScan = true;
        if (detail.starts_with("USE TEMP B-TREE"))
            access.isSorted = true;
        const size_t bracket = detail.find('(');
        if (bracket == std::string_view::npos || !access.column.empty())
            continue;
        const std::string_view rest = detail.substr(bracket + 1);
        access.column = rest.substr(0, rest.find_first_of("=<> "));
    }
    return access;
}

// Narrows the ids to those of the rows that meet the conditions on a column of times, as an index of SQLite
// has them. Rows arrive in the order of their times, more or less. False if that does not help.
bool SearchPlan::NarrowByTimes() {
    for (const std::string_view column : text_.times) {
        const std::string sql =
            "SELECT min(id), max(id), count(*) FROM main.logs WHERE " + ConditionsOn(text_, column);
        Query plan(db_, "EXPLAIN QUERY PLAN " + sql);
        if (!plan.Step() ||
            std::string_view(reinterpret_cast<const char *>(sqlite3_column_text(plan.Get(), 3)))
                    .find("USING COVERING INDEX") == std::string_view::npos)
            continue;
        Query ends(db_, sql);
        if (!ends.Step())
            return false;
        const IdRange ids = {std::max<int64_t>(text_.ids.first, sqlite3_column_int64(ends.Get(), 0)),
                             std::min<int64_t>(text_.ids.last, sqlite3_column_int64(ends.Get(), 1))};
        const int64_t count = sqlite3_column_int64(ends.Get(), 2);
        if (count > 0 && ids.first > ids.last)
            continue; // no row; the statement finds that out
        if (count == 0 || SpanOf(ids) / count > kMostGaps)
            return false;
        text_.ids = ids;
        return true;
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

// Whether there is an index that fits what this transaction reads.
bool SearchPlan::HasUsableIndex() {
    if (!isUsable_) {
        isUsable_ = index_ && index_->Fits(db_);
        if (*isUsable_)
            lastLag = std::max<int64_t>(LargestIdEver(db_) - (index_->Header().EndId() - 1), 0);
    }
    return *isUsable_;
}

bool SearchPlan::CollectAll() {
    if (!HasUsableIndex())
        return false;
    Candidates candidates(index_->File(), index_->Header(), text_.need, text_.ids);
    while (candidates.Next(IsAscending(), all_)) {
    }
    if (!candidates.IsGood())
        index_->Discard();
    return candidates.IsGood();
}

bool SearchPlan::IsWorthwhile(int64_t pageRows) {
    if (!HasIndexableTable(db_) || !BoundIds())
        return false;
    const bool isPage = pageRows != 0;
    const Access access = AccessOfStatement(pageRows);
    if (access.isScan && isPage)
        return isByStep_ = index_.has_value();
    if (!access.isScan && IsUnordered())
        return false;
    if (!access.isScan && !HasManyRows(access.column, kFewRows))
        return false;
    if (access.isSorted && isPage && ((text_.needsTimes && HasUsableIndex()) || NarrowByTimes()))
        return isByStep_ = true;
    if (!text_.needsBits || !CollectAll())
        return false;
    const int64_t count = CountIds(all_, std::numeric_limits<int64_t>::max());
    return access.isScan ? count <= SpanOf(text_.ids) / 2
                         : count <= kManyIds && HasManyRows(access.column, count);
}

// Takes the ids that a page is likely to be in off the range.
IdRange SearchPlan::TakeWindow() {
    IdRange window = text_.ids;
    if (SpanOf(window) <= kWindowIds) {
        text_.ids = {1, 0}; // what follows the largest id is no number
    } else if (IsAscending()) {
        window.last = std::min(window.last, window.first + kWindowIds - 1);
        text_.ids.first = window.last + 1;
    } else {
        window.first = std::max(window.first, window.last - kWindowIds + 1);
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
        step_ = text_.ids.first <= text_.ids.last ? Step::kOpen : Step::kDone;
        return true;
    }
    if (step_ == Step::kOpen) {
        step_ = HasUsableIndex() ? Step::kCandidates : Step::kDone;
        if (step_ == Step::kDone) {
            ranges.push_back(text_.ids);
            return true;
        }
        candidates_.emplace(index_->File(), index_->Header(), text_.need, text_.ids);
    }
    if (step_ == Step::kDone || !candidates_->Next(IsAscending(), ranges))
        return false;
    if (!candidates_->IsGood()) {
        index_->Discard();
        // What was not handed out yet.
        ranges.assign(1, candidates_->Rest(IsAscending()));
        step_ = Step::kDone;
    }
    return true;
}

} // namespace kelo::platform
