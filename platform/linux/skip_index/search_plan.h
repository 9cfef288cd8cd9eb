#pragma once

#include <sqlite3.h>

#include <cstdint>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "skip_index/candidates.h"
#include "skip_index/search_text.h"
#include "skip_index/skip_index.h"

namespace kelo::platform {

// How a statement is answered by ranges of ids instead of a scan.
//
//     auto plan = SearchPlan::Read(db, sql);
//     ... begin a transaction ...
//     if (plan && plan->IsWorthwhile(rows))
//         while (plan->Next(ranges)) ...
class SearchPlan {
public:
    // Nothing if the statement is none that can be served, or `db` is in a transaction or in the middle of a
    // statement. `sql` must outlive the plan.
    static std::optional<SearchPlan> Read(sqlite3 *db, std::string_view sql);

    const SearchText &Text() const { return text_; }
    bool IsAscending() const { return text_.order != SearchText::Order::kDescending; }

    // Decides in the transaction that reads; `pageRows` is the number of rows after which it ends, 0 for all.
    // False if the
    // statement as it is gives its rows in an order of its own, or is likely to be as fast.
    bool IsWorthwhile(int64_t pageRows);

    // The next ranges, in the order of the rows; they may be none. False after the last ones. Every row for
    // which the conditions are true is in one of them.
    bool Next(std::vector<IdRange> &ranges);

private:
    SearchPlan(sqlite3 *db, std::string_view sql, SearchText text, std::optional<SkipIndex> index)
        : db_(db), sql_(sql), text_(std::move(text)), index_(std::move(index)) {}

    bool IsUnordered() const {
        return text_.kind == SearchText::Kind::kSelect && text_.order == SearchText::Order::kNone;
    }
    bool BoundIds();
    struct Access {
        bool isScan = false;
        bool isSorted = false; // afterwards
        std::string column;    // the first one that SQLite uses an index of
    };
    Access AccessOfStatement(int64_t pageRows) const;
    bool NarrowByTimes();
    bool HasManyRows(const std::string &column, int64_t count) const;
    bool HasUsableIndex();
    bool CollectAll();
    IdRange TakeWindow();

    sqlite3 *db_;
    std::string_view sql_;
    SearchText text_;
    std::optional<SkipIndex> index_;
    std::optional<bool> isUsable_; // once it was asked for
    std::vector<IdRange> all_;     // unless they are found step by step
    bool isByStep_ = false;
    enum class Step { kWindow, kOpen, kCandidates, kDone } step_ = Step::kWindow;
    std::optional<Candidates> candidates_;
};

} // namespace kelo::platform
