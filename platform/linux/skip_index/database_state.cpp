#include "skip_index/database_state.h"

#include <algorithm>
#include <limits>
#include <string_view>

namespace kelo::platform {
namespace {

// Of all values of the row that the statement is at.
uint64_t HashOfRow(sqlite3_stmt *row) {
    uint64_t hash = 0;
    for (int column = 0; column < sqlite3_column_count(row); ++column) {
        const auto *text = reinterpret_cast<const char *>(sqlite3_column_text(row, column));
        const auto size = static_cast<size_t>(sqlite3_column_bytes(row, column));
        hash = HashOf({text != nullptr ? text : "", size}, hash + 1);
    }
    return hash;
}

} // namespace

Query::Query(sqlite3 *db, const std::string &sql)
    : status_(sqlite3_prepare_v2(db, sql.c_str(), static_cast<int>(sql.size()) + 1, &statement_, nullptr)) {}

std::string FileOf(sqlite3 *db) {
    int hasMoved = 1;
    const char *path = sqlite3_db_filename(db, "main");
    if (path == nullptr || sqlite3_file_control(db, "main", SQLITE_FCNTL_HAS_MOVED, &hasMoved) != SQLITE_OK ||
        hasMoved != 0)
        return "";
    return path;
}

bool HasIndexableTable(sqlite3 *db) {
    const auto hasColumn = [db](const char *schema, const char *column, int *isAutoincrement) {
        return sqlite3_table_column_metadata(db, schema, "logs", column, nullptr, nullptr, nullptr, nullptr,
                                             isAutoincrement) == SQLITE_OK;
    };
    int isAutoincrement = 0;
    // A temporary table would have the name first.
    if (!hasColumn("main", "id", &isAutoincrement) || isAutoincrement == 0 ||
        !hasColumn("main", "msg", nullptr) || hasColumn("temp", nullptr, nullptr))
        return false;
    Query encoding(db, "PRAGMA encoding");
    return encoding.Step() &&
           std::string_view(reinterpret_cast<const char *>(sqlite3_column_text(encoding.Get(), 0))) ==
               "UTF-8";
}

int64_t LargestIdEver(sqlite3 *db) {
    Query sequence(db, "SELECT max(seq) FROM sqlite_sequence WHERE name = 'logs' COLLATE NOCASE");
    return sequence.Step() ? sqlite3_column_int64(sequence.Get(), 0) : 0;
}

std::optional<RowSample> SampleUpTo(sqlite3 *db, int64_t upTo) {
    Query row(db, "SELECT id, * FROM main.logs WHERE id <= ?1 ORDER BY id DESC LIMIT 1");
    row.Bind(1, upTo);
    if (row.Step())
        return RowSample{upTo, sqlite3_column_int64(row.Get(), 0), HashOfRow(row.Get())};
    if (row.Status() != SQLITE_DONE)
        return std::nullopt;
    return RowSample{upTo, std::numeric_limits<int64_t>::min(), 0};
}

bool FitsDatabase(sqlite3 *db, const IndexHeader &header, const DatabaseIdentity &identity) {
    if (header.inode != identity.inode || header.birthSec != identity.birthSec ||
        header.birthNsec != identity.birthNsec || header.EndId() - 1 > LargestIdEver(db))
        return false;
    const auto *end = header.samples.begin() + header.sampleCount;
    return std::all_of(header.samples.begin(), end, [db](const RowSample &sample) {
        const auto now = SampleUpTo(db, sample.upTo);
        return now && (now->id < sample.id || *now == sample);
    });
}

} // namespace kelo::platform
