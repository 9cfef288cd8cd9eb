#include "skip_index/database_state.h"

#include <algorithm>
#include <limits>
#include <string_view>
#include <utility>
#include <vector>

#include "skip_index/candidates.h"

namespace kelo::platform {
namespace {

constexpr size_t kBitsOfRow = 24;    // of its message
constexpr size_t kBytesOfRow = 1024; // of its message, which may have millions

std::string_view TextAt(sqlite3_stmt *row, int column) {
    const auto *text = reinterpret_cast<const char *>(sqlite3_column_text(row, column));
    return {text != nullptr ? text : "", static_cast<size_t>(sqlite3_column_bytes(row, column))};
}

// Of all values of the row that the statement is at.
uint64_t HashOfRow(sqlite3_stmt *row) {
    uint64_t hash = 0;
    for (int column = 0; column < sqlite3_column_count(row); ++column)
        hash = HashOf(TextAt(row, column), hash + 1);
    return hash;
}

// What a search needs that finds the row of "msg, llevel, fac, utcsec, ldate" by all that it has.
Need NeedOfRow(sqlite3_stmt *row) {
    Need values{.kind = Need::Kind::kBits,
                .bits = BitsOfLiteral(TextAt(row, 0).substr(0, kBytesOfRow), kBitsOfRow)};
    for (const auto &[column, at] : {std::pair(TokenColumn::kSeverity, 1), {TokenColumn::kFacility, 2}}) {
        const auto bits = BitsOfToken(column, TextAt(row, at));
        values.bits.insert(values.bits.end(), bits.begin(), bits.end());
    }
    Need all{.kind = Need::Kind::kAll, .parts = {std::move(values)}};
    const auto addTime = [&all](TimeColumn column, int64_t time) {
        all.parts.push_back({.kind = Need::Kind::kTimes, .column = column, .times = {time, time}});
    };
    if (sqlite3_column_type(row, 3) == SQLITE_INTEGER)
        addTime(TimeColumn::kSecond, sqlite3_column_int64(row, 3));
    const bool isText = sqlite3_column_type(row, 4) == SQLITE_TEXT;
    if (const auto day = NumberOfDay(TextAt(row, 4)); day && isText)
        addTime(TimeColumn::kDay, *day);
    return all;
}

// Whether the index, as far as it knows the row, would find it.
bool FindsRow(sqlite3 *db, const IndexFile &file, const IndexHeader &header, int64_t id) {
    Query row(db, "SELECT msg, llevel, fac, utcsec, ldate FROM main.logs WHERE id = ?1");
    row.Bind(1, id);
    if (!row.Step())
        return false;
    const Need need = NeedOfRow(row.Get());
    Candidates candidates(file, header, need, {id, id});
    std::vector<IdRange> ranges;
    while (candidates.Next(true, ranges)) {
    }
    return !ranges.empty() || !candidates.IsGood(); // damage is no question of the database
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
    const auto hasColumn = [db](const char *column, const char *type) {
        const char *declared = nullptr;
        const char *collation = nullptr;
        return sqlite3_table_column_metadata(db, "main", "logs", column, &declared, &collation, nullptr,
                                             nullptr, nullptr) == SQLITE_OK &&
               sqlite3_stricmp(declared, type) == 0 && sqlite3_stricmp(collation, "BINARY") == 0;
    };
    int isAutoincrement = 0;
    if (sqlite3_table_column_metadata(db, "main", "logs", "id", nullptr, nullptr, nullptr, nullptr,
                                      &isAutoincrement) != SQLITE_OK ||
        isAutoincrement == 0)
        return false;
    // A temporary table or view would have the name first.
    if (Query(db, "SELECT 1 FROM temp.sqlite_schema WHERE name = 'logs' COLLATE NOCASE").Step())
        return false;
    for (const char *column : {"msg", "llevel", "fac", "ldate"}) {
        if (!hasColumn(column, "TEXT"))
            return false;
    }
    if (!hasColumn("utcsec", "INTEGER"))
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

RowSampler::RowSampler(sqlite3 *db)
    : row_(db, "SELECT id, * FROM main.logs WHERE id <= ?1 ORDER BY id DESC LIMIT 1") {}

std::optional<RowSample> RowSampler::UpTo(int64_t id) {
    row_.Reset();
    row_.Bind(1, id);
    if (row_.Step())
        return RowSample{id, sqlite3_column_int64(row_.Get(), 0), HashOfRow(row_.Get())};
    if (row_.Status() != SQLITE_DONE)
        return std::nullopt;
    return RowSample{id, std::numeric_limits<int64_t>::min(), 0};
}

bool FitsDatabase(sqlite3 *db, const IndexFile &file, const IndexHeader &header,
                  const DatabaseIdentity &identity) {
    if (header.inode != identity.inode || header.birthSec != identity.birthSec ||
        header.birthNsec != identity.birthNsec || header.EndId() - 1 > LargestIdEver(db))
        return false;
    const auto *end = header.samples.begin() + header.sampleCount;
    RowSampler sampler(db);
    int64_t found = std::numeric_limits<int64_t>::min(); // the last row that the index was asked for
    return std::all_of(header.samples.begin(), end, [&](const RowSample &sample) {
        const auto now = sampler.UpTo(sample.upTo);
        if (!now || *now == sample)
            return now.has_value();
        if (now->id >= sample.id)
            return false;
        return now->id == std::exchange(found, now->id) || FindsRow(db, file, header, now->id);
    });
}

} // namespace kelo::platform
