#pragma once

#include <algorithm>
#include <cstdint>
#include <cstdlib>
#include <limits>

#include "common/db_field.h"
#include "keloplatform/kelodb.h"

namespace kelo {

// Moves `row` to the first row of a result. Returns false when there is none.
inline bool FirstRow(DBResult_tag *result, uint32_t &row) {
    return result != nullptr && KELODBFetchRow(result, &row) >= 0;
}

// A decimal text as a signed 32-bit number: saturates at the ends of the range; 0 for a text without leading
// digits.
inline int32_t ParseInt32(const char *text) {
    const long long number = std::strtoll(text, nullptr, 10);
    return static_cast<int32_t>(std::clamp<long long>(number, std::numeric_limits<int32_t>::min(),
                                                      std::numeric_limits<int32_t>::max()));
}

} // namespace kelo
