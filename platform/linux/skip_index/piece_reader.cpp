#include "skip_index/piece_reader.h"

#include <cstddef>
#include <new>
#include <optional>
#include <string_view>

#include "skip_index/database_state.h"

namespace kelo::platform {
namespace {

// Makes "kelo_take_row" of a connection, or takes it away.
void Define(sqlite3 *db, void *context, void (*takeRow)(sqlite3_context *, int, sqlite3_value **),
            void (*endRows)(sqlite3_context *)) {
    constexpr int kColumns = 6;
    sqlite3_create_function_v2(db, "kelo_take_row", kColumns, SQLITE_UTF8 | SQLITE_DIRECTONLY, context,
                               nullptr, takeRow, endRows, nullptr);
}

// Throws std::bad_alloc.
std::string_view TextValue(sqlite3_value *value) {
    const auto *bytes = reinterpret_cast<const char *>(sqlite3_value_text(value));
    if (bytes == nullptr && sqlite3_value_type(value) != SQLITE_NULL)
        throw std::bad_alloc();
    return {bytes != nullptr ? bytes : "", static_cast<size_t>(sqlite3_value_bytes(value))};
}

// No condition finds a NULL, and other values than the usual ones may be found by any.
TimeSpan SecondOf(sqlite3_value *value) {
    const int type = sqlite3_value_type(value);
    if (type != SQLITE_INTEGER)
        return type == SQLITE_NULL ? TimeSpan{} : kAllTimes;
    const int64_t second = sqlite3_value_int64(value);
    return {second, second};
}

TimeSpan DayOf(sqlite3_value *value) {
    const int type = sqlite3_value_type(value);
    if (type != SQLITE_TEXT)
        return type == SQLITE_NULL ? TimeSpan{} : kAllTimes;
    const std::optional<int64_t> day = NumberOfDay(TextValue(value));
    return day ? TimeSpan{*day, *day} : kAllTimes;
}

} // namespace

PieceReader::PieceReader(sqlite3 *db) : db_(db) {
    Define(db, this, TakeRow, EndRows);
}

PieceReader::~PieceReader() {
    Define(db_, nullptr, nullptr, nullptr);
}

void PieceReader::TakeRow(sqlite3_context *context, int, sqlite3_value **values) {
    auto *reader = static_cast<PieceReader *>(sqlite3_user_data(context));
    try {
        reader->piece_.Add(static_cast<size_t>(sqlite3_value_int64(values[0]) - reader->firstId_),
                           {.message = TextValue(values[1]),
                            .severity = TextValue(values[2]),
                            .facility = TextValue(values[3]),
                            .times = {SecondOf(values[4]), DayOf(values[5])}});
    } catch (const std::bad_alloc &) {
        sqlite3_result_error_nomem(context);
    }
}

const Piece *PieceReader::Read(int64_t piece) {
    firstId_ = piece * kIdsPerPiece;
    piece_.Clear();
    Query rows(db_, "SELECT kelo_take_row(id, msg, llevel, fac, utcsec, ldate) FROM main.logs NOT INDEXED "
                    "WHERE id BETWEEN ?1 AND ?2");
    rows.Bind(1, firstId_);
    rows.Bind(2, firstId_ + kIdsPerPiece - 1);
    while (rows.Step()) {
    }
    if (rows.Status() != SQLITE_DONE)
        return nullptr;
    piece_.Finish();
    return &piece_;
}

} // namespace kelo::platform
