#pragma once

#include <sqlite3.h>

#include <cstdint>
#include <optional>

namespace kelo::platform {

// While this lives, SQLite keeps few pages of the database in memory. Afterwards as many as before, unless it
// has no memory for that change.
//
// A search over ranges of ids reads each page of records once, so it gains nothing from the 2 MB that SQLite
// keeps by default. They take a sixth of a short search: the kernel hands out that memory page by page, and
// what is read next is not in the processor's cache.
class SmallCache {
public:
    explicit SmallCache(sqlite3 *db);
    ~SmallCache();
    SmallCache(const SmallCache &) = delete;
    SmallCache &operator=(const SmallCache &) = delete;

private:
    void Set(int64_t size);

    sqlite3 *db_;
    std::optional<int64_t> before_; // in pages, or in KiB below zero
};

} // namespace kelo::platform
