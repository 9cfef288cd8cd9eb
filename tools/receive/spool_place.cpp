#include "receive/spool_place.h"

#include <cstdio>

namespace kelo::tool {
namespace {

std::string NameOf(SpoolReader reader) {
    return reader == SpoolReader::kRows ? "'rows'" : "'counts'";
}

std::string Hex(const std::string &bytes) {
    std::string text;
    char digits[3];
    for (const char byte : bytes) {
        std::snprintf(digits, sizeof digits, "%02x", static_cast<unsigned char>(byte));
        text += digits;
    }
    return text;
}

} // namespace

std::vector<std::string> PlaceStatements(SpoolReader reader, std::span<const SpoolPlace> places) {
    std::vector<std::string> statements{
        "CREATE TABLE IF NOT EXISTS spool_place(reader TEXT, inode INTEGER, head BLOB, offset INTEGER)",
        "DELETE FROM spool_place WHERE reader = " + NameOf(reader)};
    std::string rows;
    for (const SpoolPlace &place : places)
        rows += (rows.empty() ? "(" : ",(") + NameOf(reader) + "," +
                std::to_string(static_cast<int64_t>(place.inode)) + ",x'" + Hex(place.head) + "'," +
                std::to_string(place.offset) + ")";
    if (!rows.empty())
        statements.push_back("INSERT INTO spool_place VALUES " + rows);
    return statements;
}

std::vector<SpoolPlace> LoadPlaces(SqliteConnection &database, SpoolReader reader) {
    std::vector<SpoolPlace> places;
    if (database.Number("SELECT count(*) FROM sqlite_schema WHERE type = 'table' AND name = 'spool_place'") ==
        0)
        return places;
    SqliteStatement rows(database,
                         "SELECT inode, head, offset FROM spool_place WHERE reader = " + NameOf(reader));
    while (rows.Step())
        places.push_back(
            {static_cast<ino_t>(rows.Number(0)), rows.Blob(1), static_cast<uint64_t>(rows.Number(2))});
    return places;
}

} // namespace kelo::tool
