#pragma once

#include <cstddef>
#include <cstdint>
#include <string_view>
#include <vector>

#include "skip_index/sql_tokens.h"
#include "skip_index/zone.h"

namespace kelo::platform {

// What a row must have for a condition to be true, as far as the index knows: sufficient to rule a row out,
// never to accept it.
struct Need {
    enum class Kind {
        kNothing, // the condition says nothing of the kind
        kBits,    // all of these bits, of grams of its message or of a value
        kTimes,   // a time of `times` in `column`
        kAll,     // all of the parts
        kAny      // one of the parts
    };
    Kind kind = Kind::kNothing;
    std::vector<uint16_t> bits{};
    std::vector<Need> parts{};
    TimeColumn column = TimeColumn::kSecond;
    TimeSpan times{};
};

// What a condition needs, whose brackets are plain.
Need NeedOfCondition(SqlTokens tokens);

// Whether it needs bits, and how many in all of its parts.
bool NeedsBits(const Need &need);
size_t CountBits(const Need &need);

// Narrows a range of whole numbers by a comparison with `value`: ">", "<", ">=" or "<=". False for another
// one.
bool Narrow(std::string_view comparison, int64_t value, int64_t &first, int64_t &last);

} // namespace kelo::platform
