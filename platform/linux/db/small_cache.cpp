#include "db/small_cache.h"

#include <cstdio>

#include "db/statement.h"

namespace kelo::platform {
namespace {

constexpr int64_t kSmall = 24; // pages, far more than a path from the root to a record

std::optional<int64_t> SizeOf(sqlite3 *db) {
    sqlite3_stmt *prepared = nullptr;
    if (sqlite3_prepare_v2(db, "PRAGMA main.cache_size", -1, &prepared, nullptr) != SQLITE_OK)
        return std::nullopt;
    const Statement statement(prepared);
    if (sqlite3_step(prepared) != SQLITE_ROW)
        return std::nullopt;
    return sqlite3_column_int64(prepared, 0);
}

} // namespace

SmallCache::SmallCache(sqlite3 *db) : db_(db), before_(SizeOf(db)) {
    if (before_)
        Set(kSmall);
}

SmallCache::~SmallCache() {
    if (before_)
        Set(*before_);
}

void SmallCache::Set(int64_t size) {
    char sql[64]; // no string, which could fail in the destructor
    std::snprintf(sql, sizeof sql, "PRAGMA main.cache_size=%lld", static_cast<long long>(size));
    sqlite3_exec(db_, sql, nullptr, nullptr, nullptr);
}

} // namespace kelo::platform
