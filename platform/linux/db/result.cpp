#include "db/result.h"

#include <charconv>
#include <new>
#include <stdexcept>

#include "common/failure.h"

namespace {

using kelo::platform::Cell;

// Makes `cell` the text of a value, which it refers to. False when there is no memory.
bool TakeValue(sqlite3_value *value, DBResult_tag::Source &source, Cell &cell) {
    // SQLite makes the same text of an integer, but slowly. After a text there is rarely one, so to ask each
    // time would take longer.
    const int type = source.hadText ? SQLITE_TEXT : sqlite3_value_type(value);
    if (type == SQLITE_INTEGER) {
        cell = source.TextOf(sqlite3_value_int64(value));
        return true;
    }
    const auto *text = reinterpret_cast<const char *>(sqlite3_value_text(value));
    source.hadText = type == SQLITE_TEXT && text != nullptr;
    cell = {text, text != nullptr ? static_cast<size_t>(sqlite3_value_bytes(value)) : 0};
    return text != nullptr || sqlite3_value_type(value) == SQLITE_NULL;
}

} // namespace

// Row after row has the same second or the next, the next id, and of a page by row id the same total.
Cell DBResult_tag::Source::TextOf(int64_t next) {
    char &last = digits[size - 1];
    if (number > 0 && next >= number && next - number <= '9' - last)
        last = static_cast<char>(last + (next - number));
    else
        size = static_cast<size_t>(std::to_chars(digits.begin(), digits.end(), next).ptr - digits.data());
    number = next;
    return {digits.data(), size};
}

DBResult_tag::DBResult_tag(sqlite3_stmt *statement)
    : cells(static_cast<size_t>(sqlite3_column_count(statement))), sources(cells.size()),
      values(cells.size()) {
    for (int column = 0; column < sqlite3_column_count(statement); ++column) {
        const char *name = sqlite3_column_name(statement, column);
        if (name == nullptr)
            throw std::bad_alloc();
        columns.Add(name);
    }
}

DBResult_tag::DBResult_tag(std::span<const std::string> columnNames)
    : cells(columnNames.size()), sources(cells.size()), values(cells.size()) {
    for (const std::string &name : columnNames)
        columns.Add(name);
}

void DBResult_tag::AddRow() {
    if (rows.Count() == kMaxRows)
        throw std::length_error("too many rows");
    rows.Add(cells);
}

void DBResult_tag::AddRow(sqlite3_value *const *rowValues) {
    Cell *cell = cells.data();
    for (Source &source : sources) {
        if (!TakeValue(*rowValues++, source, *cell++))
            throw std::bad_alloc();
    }
    AddRow();
}

// One call into the statement for each cell: the functions that take a column check the connection's state
// each time. One thread uses the connection, so the values need no protection.
void DBResult_tag::AddRowOf(sqlite3_stmt *statement) {
    for (size_t column = 0; column < values.size(); ++column)
        values[column] = sqlite3_column_value(statement, static_cast<int>(column));
    AddRow(values.data());
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
