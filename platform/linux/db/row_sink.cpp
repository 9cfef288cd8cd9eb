#include "db/row_sink.h"

#include <algorithm>
#include <new>
#include <stdexcept>
#include <string>

namespace kelo::platform {
namespace {

constexpr char kResultType[] = "kelo-result";

// The aggregate's step: the result, then a row of it. The result comes as a pointer that SQL cannot make, so
// that a query which calls the aggregate itself gets an error.
void Deliver(sqlite3_context *context, int count, sqlite3_value **values) {
    auto *result =
        count > 0 ? static_cast<DBResult_tag *>(sqlite3_value_pointer(values[0], kResultType)) : nullptr;
    if (result == nullptr || static_cast<size_t>(count - 1) != result->cells.size()) {
        sqlite3_result_error(context, "kelo_rows() is internal", -1);
        return;
    }
    try {
        result->AddRow(values + 1);
    } catch (const std::bad_alloc &) {
        sqlite3_result_error_nomem(context);
    } catch (const std::length_error &) {
        sqlite3_result_error_toobig(context);
    }
}

void Finish(sqlite3_context *) {}

// The columns are renamed, because their own names can be any text and need not be unique.
std::string WrappedText(std::string_view query, size_t columnCount) {
    std::string names;
    for (size_t column = 0; column < columnCount; ++column)
        names.append(column > 0 ? ",c" : "c").append(std::to_string(column));
    std::string text = "WITH kelo_query(" + names + ") AS (";
    text.append(query).append(kCommentEnd).append(") SELECT kelo_rows(?1,").append(names);
    return text.append(") FROM kelo_query");
}

} // namespace

bool IsCopied(std::string_view query) {
    const auto has = [query](std::string_view word) {
        const auto isSame = [](char byte, char letter) { return (byte | 0x20) == letter; };
        return std::search(query.begin(), query.end(), word.begin(), word.end(), isSame) != query.end();
    };
    return has("order") || has("limit");
}

Statement PrepareRowSink(sqlite3 *db, const SingleStatement &query, DBResult_tag &result) {
    if (sqlite3_stmt_readonly(query.prepared.get()) == 0 ||
        sqlite3_stmt_isexplain(query.prepared.get()) != 0 ||
        static_cast<int>(result.cells.size()) >= sqlite3_limit(db, SQLITE_LIMIT_FUNCTION_ARG, -1))
        return nullptr;
    const std::string text = WrappedText(query.text, result.cells.size());
    sqlite3_stmt *statement = nullptr;
    if (sqlite3_create_function_v2(db, "kelo_rows", -1, SQLITE_UTF8 | SQLITE_DIRECTONLY, nullptr, nullptr,
                                   Deliver, Finish, nullptr) != SQLITE_OK ||
        sqlite3_prepare_v2(db, text.c_str(), static_cast<int>(text.size()) + 1, &statement, nullptr) !=
            SQLITE_OK)
        return nullptr;
    Statement sink(statement);
    if (sqlite3_bind_pointer(statement, 1, &result, kResultType, nullptr) != SQLITE_OK)
        return nullptr;
    return sink;
}

} // namespace kelo::platform
