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

    // Appends the row in `cells`. Throws std::bad_alloc, or std::length_error when the result is full.
    void AddRow();

    // The same with a row of values, one for each column.
    void AddRow(sqlite3_value *const *values);

    // The same with the row that a statement with as many columns is at.
    void AddRowOf(sqlite3_stmt *statement);

    // What is known of a column from the rows before.
    struct Source {
        // The text of an integer, without a NUL, until the next call. Faster than SQLite's conversion.
        kelo::platform::Cell TextOf(int64_t next);

        std::array<char, 20> digits = {'0'}; // of the last integer; -9223372036854775808 is the longest
        size_t size = 1;                     // of the digits
        int64_t number = 0;                  // of which they are the text
        bool hadText = false;                // whether the last value was a text
    };

    kelo::platform::ColumnIndex columns;
    kelo::platform::RowBlock rows;
    std::vector<kelo::platform::Cell> cells; // the row that is being delivered, one cell a column
    std::vector<Source> sources;             // one a column
    std::vector<sqlite3_value *> values;     // of the row that a statement is at
    uint32_t nextRow = 0;
};
