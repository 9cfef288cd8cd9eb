#include "db/result.h"

#include <charconv>
#include <new>
#include <stdexcept>

#include "common/failure.h"

DBResult_tag::DBResult_tag(sqlite3_stmt *statement)
    : cells(static_cast<size_t>(sqlite3_column_count(statement))), digits(cells.size()),
      numbers(cells.size()) {
    for (int column = 0; column < sqlite3_column_count(statement); ++column) {
        const char *name = sqlite3_column_name(statement, column);
        if (name == nullptr)
            throw std::bad_alloc();
        columns.Add(name);
    }
}

DBResult_tag::DBResult_tag(std::span<const std::string> columnNames)
    : cells(columnNames.size()), digits(cells.size()) {
    for (const std::string &name : columnNames)
        columns.Add(name);
}

kelo::platform::Cell DBResult_tag::TextOf(int64_t number, Digits &digits) {
    char *end = std::to_chars(digits.begin(), digits.end(), number).ptr;
    return {digits.data(), static_cast<size_t>(end - digits.data())};
}

void DBResult_tag::AddRow() {
    if (rows.Count() == kMaxRows)
        throw std::length_error("too many rows");
    rows.Add(cells);
}

// One call into the statement for each cell: the functions that take a column check the connection's state
// each time. One thread uses the connection, so the values need no protection.
void DBResult_tag::AddRowOf(sqlite3_stmt *statement) {
    for (size_t i = 0; i < cells.size(); ++i) {
        sqlite3_value *value = sqlite3_column_value(statement, static_cast<int>(i));
        const int type = sqlite3_value_type(value);
        if (type == SQLITE_INTEGER) {
            const int64_t number = sqlite3_value_int64(value);
            // Row after row has the same second, and of a page by row id the same total.
            if (number != numbers[i] || cells[i].text != digits[i].data()) {
                cells[i] = TextOf(number, digits[i]);
                numbers[i] = number;
            }
            continue;
        }
        const auto *text = reinterpret_cast<const char *>(sqlite3_value_text(value));
        if (text == nullptr && type != SQLITE_NULL)
            throw std::bad_alloc();
        cells[i] = {text, text != nullptr ? static_cast<size_t>(sqlite3_value_bytes(value)) : 0};
    }
    AddRow();
}

int KELODBNumRows(DBResult_tag *result) {
    return result != nullptr ? static_cast<int>(result->rows.Count()) : 0;
}

int KELODBFetchRow(DBResult_tag *result, unsigned int *row) {
    if (result == nullptr || row == nullptr)
        return kelo::platform::Fail(KELO_FAILURE_ARGUMENT, "KELODBFetchRow", "",
                                    "no result, or nowhere to put the row");
    if (result->nextRow >= result->rows.Count())
        return -1;
    *row = result->nextRow++;
    return 0;
}

const char *KELODBFetchField(DBResult_tag *result, unsigned int row, const char *column) {
    if (result == nullptr || column == nullptr || row >= result->rows.Count())
        return nullptr;
    const uint32_t position = result->columns.Find(column);
    return position != kelo::platform::ColumnIndex::kNone ? result->rows.Text(row, position) : nullptr;
}

void KELODBFreeResult(DBResult_tag *result) {
    delete result;
}
