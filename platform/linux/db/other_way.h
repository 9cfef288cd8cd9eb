#pragma once

#include <sqlite3.h>

#include <memory>
#include <optional>

#include "db/raise_error.h"
#include "db/result.h"
#include "db/small_cache.h"
#include "skip_index/transaction.h"

namespace kelo::platform {

enum class Access { kRead, kWrite };

// Answers a statement in another way than SQLite would, in one transaction: `isPossible` says whether to try,
// `run` collects the rows and returns whether that worked. Returns true when it did, false with the
// connection's error when it was interrupted, and nothing, with no rows, when the statement itself has to
// run, which also reports its own error.
template <typename IsPossible, typename Run>
std::optional<bool> AnswerInOtherWay(sqlite3 *db, Access access, const IsPossible &isPossible, const Run &run,
                                     std::unique_ptr<DBResult_tag> &rows) {
    bool isInterrupted = false;
    {
        std::optional<SmallCache> cache; // not while rows are deleted, which changes pages of every index
        Transaction transaction(db, access == Access::kWrite ? "BEGIN IMMEDIATE" : "BEGIN");
        if (!transaction.IsOpen() || !isPossible())
            return std::nullopt;
        if (access == Access::kRead)
            cache.emplace(db);
        if (run() && transaction.Commit())
            return true;
        isInterrupted = sqlite3_errcode(db) == SQLITE_INTERRUPT;
    }
    rows.reset();
    if (!isInterrupted)
        return std::nullopt;
    RaiseError(db, SQLITE_INTERRUPT, "interrupted");
    return false;
}

} // namespace kelo::platform
