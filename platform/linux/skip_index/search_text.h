#pragma once

#include <cstdint>
#include <limits>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "skip_index/need.h"

namespace kelo::platform {

struct IdRange {
    int64_t first = std::numeric_limits<int64_t>::min();
    int64_t last = std::numeric_limits<int64_t>::max(); // included
};

// A statement that the skip index can serve: it reads or deletes the rows of table "logs" for which all of
// some conditions are true.
struct SearchText {
    enum class Kind { kSelect, kCount, kDelete };
    enum class Order { kNone, kAscending, kDescending }; // by id

    Kind kind = Kind::kSelect;
    std::string_view head; // "SELECT * FROM logs"
    // Conditions joined by AND, without those of the id, which are in `ids`. Each is complete in itself.
    std::vector<std::string_view> conditions;
    IdRange ids;
    Order order = Order::kNone;
    Need need;
    // What it needs of. SQLite has indexes for times.
    bool needsBits = false;
    bool needsTimes = false;
    // The columns of times that have conditions of their own: "ldate", "utcsec".
    std::vector<std::string_view> times;
    // Whether every condition is about messages, and needs something: no index of SQLite serves any of them.
    bool isTextOnly = true;
};

// Takes a statement apart. Nothing for any text that is not known to be one of these, or that neither bits
// nor times say anything about. The result refers to `sql`.
std::optional<SearchText> ReadSearchText(std::string_view sql);

// The conditions, joined: all, or those on `column` alone; "" if there is none.
std::string AllConditions(const SearchText &search);
std::string ConditionsOn(const SearchText &search, std::string_view column);

} // namespace kelo::platform
