#pragma once

#include <array>
#include <cstdint>
#include <optional>
#include <string>
#include <string_view>

namespace kelo::tool {

// A row of table "logs" with the bytes of its texts, as it is moved into a cluster and out of it.
struct EngineRow {
    static constexpr size_t kTexts = 11;
    uint64_t source = 0; // the id in the database that it comes from
    int64_t second = 0;  // column utcsec
    std::array<std::string, kTexts> texts;
};

// The columns of a row in the order of the table, without the id: the texts, and utcsec among them.
inline constexpr const char *kEngineColumns[] = {"host",   "ip",       "fac",   "prio",  "llevel", "tag",
                                                 "utcsec", "tzoffset", "ldate", "ltime", "prog",   "msg"};
inline constexpr size_t kSecondColumn = 6;

// The columns with commas between them.
std::string EngineColumns();

// Passes the column with this number: the text, or null for utcsec.
template <typename Row, typename Take>
void ForEachColumn(Row &row, Take take) {
    size_t text = 0;
    for (size_t column = 0; column < std::size(kEngineColumns); ++column)
        take(column, column == kSecondColumn ? nullptr : &row.texts[text++]);
}

// The id that table logs_shard gives a row of log server `node` (schema/cluster.sql).
inline constexpr int kNodeBits = 8;
inline constexpr int kMessageBits = 22;
inline constexpr uint64_t kMessageMask = (uint64_t{1} << kMessageBits) - 1;
uint64_t EngineId(const EngineRow &row, unsigned int node);
// The first and the last id of a second, of any log server.
uint64_t FirstEngineId(int64_t second);
uint64_t LastEngineId(int64_t second);

// Half of the MD5 of a row without its id, and the expression that computes it on a server. Throws
// std::runtime_error without libcrypto.
uint64_t HashOf(const EngineRow &row);
std::string HashExpression();

// Appends a row in the format RowBinary, with the columns above.
void AppendRow(const EngineRow &row, std::string &bytes);
// Takes the next row off such bytes; nothing if they end within one.
std::optional<EngineRow> TakeRow(std::string_view &bytes);

} // namespace kelo::tool
