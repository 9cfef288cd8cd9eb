#pragma once

#include <cstdint>

#include "keloplatform/kelodb.h"

namespace kelo {

// Text of a column of a row; a missing column and a NULL give the empty text. It belongs to the result.
inline const char *FieldText(DBResult_tag *result, uint32_t row, const char *column) {
    const char *text = KELODBFetchField(result, row, column);
    return text != nullptr ? text : "";
}

} // namespace kelo
