#include "db/result.h"

namespace kelo::platform {

void TakeColumns(DBResult_tag &result, sqlite3_stmt *statement) {
    result.columnCount = static_cast<uint32_t>(sqlite3_column_count(statement));
    for (uint32_t column = 0; column < result.columnCount; ++column)
        result.columns.emplace(sqlite3_column_name(statement, static_cast<int>(column)), column);
}

void TakeRow(DBResult_tag &result, sqlite3_stmt *statement) {
    for (uint32_t column = 0; column < result.columnCount; ++column) {
        const auto *text =
            reinterpret_cast<const char *>(sqlite3_column_text(statement, static_cast<int>(column)));
        if (text == nullptr) {
            result.cells.push_back(DBResult_tag::kNull);
            continue;
        }
        result.cells.push_back(result.text.size());
        result.text.insert(result.text.end(), text,
                           text + sqlite3_column_bytes(statement, static_cast<int>(column)) + 1);
    }
    ++result.rowCount;
}

} // namespace kelo::platform

int KELODBNumRows(DBResult_tag *result) {
    return result != nullptr ? static_cast<int>(result->rowCount) : 0;
}

int KELODBFetchRow(DBResult_tag *result, unsigned int *row) {
    if (result == nullptr || row == nullptr || result->nextRow >= result->rowCount)
        return -1;
    *row = result->nextRow++;
    return 0;
}

const char *KELODBFetchField(DBResult_tag *result, unsigned int row, const char *column) {
    if (result == nullptr || column == nullptr || row >= result->rowCount)
        return nullptr;
    const auto found = result->columns.find(column);
    if (found == result->columns.end())
        return nullptr;
    const uint64_t offset = result->cells[static_cast<size_t>(row) * result->columnCount + found->second];
    return offset == DBResult_tag::kNull ? nullptr : result->text.data() + offset;
}

void KELODBFreeResult(DBResult_tag *result) {
    delete result;
}
