#include "db/select_cache.h"

#include <strings.h>

#include <algorithm>
#include <iterator>
#include <new>
#include <utility>

namespace kelo::platform {
namespace {

constexpr size_t kMostStatements = 16;
constexpr size_t kMostBytes = 4096; // of a text: longer ones are rarely repeated
constexpr std::string_view kSelect = "SELECT ";

} // namespace

sqlite3_stmt *SelectCache::Find(const Key &key) {
    const auto found = std::ranges::find_if(entries_, [&](const Entry &entry) {
        return Key{entry.sql, entry.limit} == key;
    });
    if (found == entries_.end())
        return nullptr;
    entries_.splice(entries_.begin(), entries_, found);
    return found->statement.get();
}

void SelectCache::Keep(const Key &key, Statement statement) {
    if (key.sql.size() > kMostBytes || sqlite3_stmt_readonly(statement.get()) == 0 ||
        strncasecmp(key.sql.data(), kSelect.data(), kSelect.size()) != 0)
        return;
    sqlite3_reset(statement.get());
    try {
        entries_.push_front({std::string(key.sql), key.limit, std::move(statement)});
    } catch (const std::bad_alloc &) {
        return; // it is prepared anew next time
    }
    // Of a statement that was of no use any more there is a fresh one now.
    const auto older = std::find_if(std::next(entries_.begin()), entries_.end(), [&](const Entry &entry) {
        return Key{entry.sql, entry.limit} == key;
    });
    if (older != entries_.end())
        entries_.erase(older);
    else if (entries_.size() > kMostStatements)
        entries_.pop_back();
}

} // namespace kelo::platform
