#include "read/accounting_samples.h"

#include <filesystem>

#include "base/number_text.h"
#include "read/read_only_query.h"

namespace kelo::tool {
namespace {

constexpr const char *kPath = "/var/log/kelolog/.KELOACCOUNTDB";

} // namespace

std::string AccountingPath(const std::string &db, const std::string &root) {
    return db.empty() ? root + kPath : std::filesystem::absolute(db).string();
}

void RequireHistogram(const std::string &path) {
    ReadOnlyQuery({path, "histogram"}).FirstRow("SELECT device, count FROM histogram LIMIT 1", {});
}

std::optional<StampRange> StoredStamps(const std::string &path, const StampRange &range) {
    const std::string where =
        " FROM eps WHERE stamp BETWEEN " + std::to_string(range.first) + " AND " + std::to_string(range.last);
    // Each of the two uses one end of the index.
    const std::string sql = "SELECT (SELECT min(stamp)" + where + ") AS first, (SELECT max(stamp)" + where +
                            ") AS last, (SELECT device || eps FROM eps LIMIT 1) AS probe";
    const auto ends = ReadOnlyQuery({path, "eps"}).FirstRow(sql, {"first", "last"});
    if (!ends || ends->front().empty())
        return std::nullopt;
    return StampRange{SignedNumber(ends->front()), SignedNumber(ends->back())};
}

} // namespace kelo::tool
