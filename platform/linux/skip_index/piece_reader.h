#pragma once

#include <sqlite3.h>

#include <cstdint>

#include "skip_index/piece.h"

namespace kelo::platform {

// Reads the rows of pieces of table "logs".
//
// It takes them as an aggregate function of the connection: to step through the rows and ask for their
// columns takes SQLite half as long again.
class PieceReader {
public:
    // The connection must outlive the object, and have no other one. Throws std::bad_alloc.
    explicit PieceReader(sqlite3 *db);
    ~PieceReader();
    PieceReader(const PieceReader &) = delete;
    PieceReader &operator=(const PieceReader &) = delete;

    // Nothing if they cannot be read. The piece holds until the next call.
    const Piece *Read(int64_t piece);

private:
    static void TakeRow(sqlite3_context *context, int, sqlite3_value **values);
    static void EndRows(sqlite3_context *) {}

    sqlite3 *db_;
    Piece piece_;
    int64_t firstId_ = 0;
};

} // namespace kelo::platform
