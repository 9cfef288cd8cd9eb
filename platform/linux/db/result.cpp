#include "db/result.h"

#include <charconv>
#include <new>
#include <stdexcept>

#include "common/failure.h"

DBResult_tag::DBResult_tag(sqlite3_stmt *statement)
    : cells(static_cast<size_t>(sqlite3_column_count(statement))), digits(cells.size()),
      numbers(cells.size()), hadText(cells.size()) {
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

bool DBResult_tag::TakeValue(size_t column, sqlite3_value *value) {
    kelo::platform::Cell &cell = cells[column];
    // SQLite makes the same text of an integer, but slowly. After a text there is rarely one, so to ask each
    // time would take longer.
    const int type = hadText[column] != 0 ? SQLITE_TEXT : sqlite3_value_type(value);
    if (type == SQLITE_INTEGER) {
        const int64_t number = sqlite3_value_int64(value);
        // Row after row has the same second, and of a page by row id the same total.
        if (number != numbers[column] || cell.text != digits[column].data()) {
            cell = TextOf(number, digits[column]);
            numbers[column] = number;
        }
        return true;
    }
    const auto *text = reinterpret_cast<const char *>(sqlite3_value_text(value));
    hadText[column] = static_cast<char>(type == SQLITE_TEXT && text != nullptr);
    cell = {text, text != nullptr ? static_cast<size_t>(sqlite3_value_bytes(value)) : 0};
    return text != nullptr || sqlite3_value_type(value) == SQLITE_NULL;
}

// One call into the statement for each cell: the functions that take a column check the connection's state
// each time. One thread uses the connection, so the values need no protection.
void DBResult_tag::AddRowOf(sqlite3_stmt *statement) {
    for (size_t column = 0; column < cells.size(); ++column) {
        if (!TakeValue(column, sqlite3_column_value(statement, static_cast<int>(column))))
            throw std::bad_alloc();
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
