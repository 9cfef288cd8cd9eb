#pragma once

#include <cstdint>
#include <list>
#include <string>
#include <string_view>

#include "db/statement.h"

namespace kelo::platform {

// The last SELECT statements of a connection, prepared: compiling a small one costs as much as running it.
class SelectCache {
public:
    // A statement, by its text and the limit of its page; none without bounds.
    struct Key {
        std::string_view sql;
        int64_t limit;
        bool operator==(const Key &) const = default;
    };
    static constexpr int64_t kNoLimit = -1;

    // The statement that was kept for the key; null for none. Valid until the next call of Keep.
    sqlite3_stmt *Find(const Key &key);

    // Keeps a statement that has run, if it is a SELECT of a usual length.
    void Keep(const Key &key, Statement statement);

    // Ends all statements: before the connection is closed.
    void Clear() { entries_.clear(); }

private:
    struct Entry {
        std::string sql;
        int64_t limit;
        Statement statement;
    };
    std::list<Entry> entries_; // the one used last is the first
};

} // namespace kelo::platform
