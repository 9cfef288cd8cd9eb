#include "archive/removal.h"

#include "archive/open_options.h"
#include "base/errors.h"

namespace kelo::tool {
namespace {

constexpr int kRowsPerLook = 100;
constexpr const char *kRows = "SELECT id, utcsec, host, prog, msg FROM logs WHERE id >= ?1 ORDER BY id";
constexpr const char *kRemove =
    "DELETE FROM logs WHERE id = ?1 AND utcsec IS ?2 AND host IS ?3 AND prog IS ?4 AND msg IS ?5";
constexpr int kColumns = 5;

} // namespace

Removal::Removal(const std::string &source, const std::string &archive)
    : source_(source, kToWrite), archive_(archive, kToRead), rows_(archive_, kRows),
      remove_(source_, kRemove), changes_(source_) {}

void Removal::Run() {
    try {
        rows_.Bind(1, source_.Number("SELECT min(id) FROM logs"));
        hasRow_ = rows_.Step();
        while (hasRow_)
            removed_ += changes_.Run([this](int64_t rows, auto end) { return RemoveRows(rows, end); });
    } catch (const DatabaseError &error) {
        throw DatabaseError(std::string(error.what()) + "; " + std::to_string(removed_) +
                            " archived logs were removed before, the others are still there");
    }
}

uint64_t Removal::RemoveRows(int64_t rows, PacedChanges::Clock::time_point end) {
    uint64_t count = 0;
    for (int64_t row = 0; hasRow_ && row < rows; ++row) {
        if (row % kRowsPerLook == 0 && PacedChanges::Clock::now() >= end)
            break;
        for (int column = 0; column < kColumns; ++column)
            remove_.BindColumn(column + 1, rows_, column);
        remove_.Run();
        count += source_.Changes();
        hasRow_ = rows_.Step();
    }
    return count;
}

} // namespace kelo::tool
