#pragma once

#include <sqlite3.h>

#include <cstdint>
#include <string>
#include <unordered_map>
#include <vector>

#include "keloplatform/kelodb.h"

// All rows of one statement: the cells as offsets into one block of text.
struct DBResult_tag {
    std::unordered_map<std::string, uint32_t> columns; // position by name
    uint32_t columnCount = 0;
    std::vector<uint64_t> cells; // row by row, offset into `text`; kNull for NULL
    std::vector<char> text;
    uint32_t rowCount = 0;
    uint32_t nextRow = 0;

    static constexpr uint64_t kNull = UINT64_MAX;
};

namespace kelo::platform {

// Prepares the result for the columns of a statement.
void TakeColumns(DBResult_tag &result, sqlite3_stmt *statement);
// Appends the statement's current row.
void TakeRow(DBResult_tag &result, sqlite3_stmt *statement);

} // namespace kelo::platform
