#pragma once

#include <sqlite3.h>

#include <cstdint>
#include <optional>
#include <string>

#include "skip_index/index_file.h"

namespace kelo::platform {

// A prepared statement that ends with its scope. Its functions report no error: a statement that cannot run
// has no rows.
class Query {
public:
    Query(sqlite3 *db, const std::string &sql);
    ~Query() { sqlite3_finalize(statement_); }
    Query(const Query &) = delete;
    Query &operator=(const Query &) = delete;

    void Bind(int index, int64_t value) { sqlite3_bind_int64(statement_, index, value); }
    // Begins again with other values.
    void Reset() { sqlite3_reset(statement_); }
    // Whether there is a further row.
    bool Step() { return (status_ = sqlite3_step(statement_)) == SQLITE_ROW; }
    // SQLITE_DONE after the last row, or the error.
    int Status() const { return status_; }
    sqlite3_stmt *Get() const { return statement_; }

private:
    sqlite3_stmt *statement_ = nullptr;
    int status_;
};

// The file of a connection, as long as it has its name; "" otherwise.
std::string FileOf(sqlite3 *db);

// Whether ids of table "logs" never come back and its values are what the index needs: an ordinary table with
// AUTOINCREMENT in a UTF-8 database, whose columns have the types and the collation of the shipped schema.
bool HasIndexableTable(sqlite3 *db);

// The largest id that table "logs" ever had; 0 if it never had one.
int64_t LargestIdEver(sqlite3 *db);

// Reads samples of table "logs".
class RowSampler {
public:
    explicit RowSampler(sqlite3 *db);
    // The newest row up to an id now. Nothing if it cannot be read.
    std::optional<RowSample> UpTo(int64_t id);

private:
    Query row_;
};

// Whether the index is that of this file with this content: the remembered rows are the same or gone, no
// others have come, and the rows before those that are gone are as the index has them. The last condition is
// for a database whose ids were used again, by an older copy or by an emptied table, and where the rows that
// would show it were deleted since.
bool FitsDatabase(sqlite3 *db, const IndexFile &file, const IndexHeader &header,
                  const DatabaseIdentity &identity);

} // namespace kelo::platform
