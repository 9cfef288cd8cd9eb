#pragma once

#include <sqlite3.h>

#include <array>
#include <climits>
#include <cstdint>
#include <span>
#include <string>
#include <vector>

#include "db/column_index.h"
#include "db/row_block.h"
#include "keloplatform/kelodb.h"

// All rows of one statement.
struct DBResult_tag {
    // KELODBNumRows counts in an int: a result with more rows fails instead of losing some.
    static constexpr uint64_t kMaxRows = INT_MAX;

    // Takes the column names of a statement. Throws std::bad_alloc.
    explicit DBResult_tag(sqlite3_stmt *statement);
    explicit DBResult_tag(std::span<const std::string> columnNames);

    using Digits = std::array<char, 20>; // -9223372036854775808
    // An integer as a text in `digits`, which is faster than SQLite's conversion. The text has no NUL.
    static kelo::platform::Cell TextOf(int64_t number, Digits &digits);

    // Makes the cell of a column the text of a value, which it refers to. False when there is no memory.
    bool TakeValue(size_t column, sqlite3_value *value);

    // Appends the row in `cells`. Throws std::bad_alloc, or std::length_error when the result is full.
    void AddRow();

    // The same with the row that a statement with as many columns is at.
    void AddRowOf(sqlite3_stmt *statement);

    kelo::platform::ColumnIndex columns;
    kelo::platform::RowBlock rows;
    std::vector<kelo::platform::Cell> cells; // the row that is being delivered, one cell a column
    std::vector<Digits> digits;              // of the integers in `cells`
    std::vector<int64_t> numbers;            // of which they are the texts
    std::vector<char> hadText;               // whether the last value of a column was a text
    uint32_t nextRow = 0;
};
