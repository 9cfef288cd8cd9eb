#include "accounting_source.h"

#include <cstdlib>
#include <filesystem>
#include <memory>

#include "errors.h"
#include "keloplatform/kelodb.h"
#include "log_source.h"

namespace kelo::tool {
namespace {

constexpr const char *kPath = "/var/log/kelolog/.KELOACCOUNTDB";

struct Close {
    void operator()(DBConnect_tag *connection) const { KELODBClose(connection); }
};
struct Free {
    void operator()(DBResult_tag *result) const { KELODBFreeResult(result); }
};
using Result = std::unique_ptr<DBResult_tag, Free>;

Result Ask(const std::string &path, const std::string &table, const std::string &sql) {
    const std::unique_ptr<DBConnect_tag, Close> connection(
        KELODBConnect(nullptr, nullptr, nullptr, path.c_str()));
    DBResult_tag *result = nullptr;
    if (connection == nullptr || KELODBExecute(connection.get(), sql.c_str(), &result) < 0)
        throw DatabaseError(DescribeDatabaseProblem({path, table}));
    return Result(result);
}

} // namespace

std::string AccountingPath(const std::string &db, const std::string &root) {
    return db.empty() ? root + kPath : std::filesystem::absolute(db).string();
}

void RequireHistogram(const std::string &path) {
    Ask(path, "histogram", "SELECT device, count FROM histogram LIMIT 1");
}

std::optional<StampRange> StoredStamps(const std::string &path, const StampRange &range) {
    const std::string where =
        " FROM eps WHERE stamp BETWEEN " + std::to_string(range.first) + " AND " + std::to_string(range.last);
    // Each of the two has an end of the index to itself.
    const std::string sql = "SELECT (SELECT min(stamp)" + where + ") AS first, (SELECT max(stamp)" + where +
                            ") AS last, (SELECT device || eps FROM eps LIMIT 1) AS probe";
    const Result result = Ask(path, "eps", sql);
    unsigned int row = 0;
    if (KELODBFetchRow(result.get(), &row) < 0)
        return std::nullopt;
    const char *first = KELODBFetchField(result.get(), row, "first");
    const char *last = KELODBFetchField(result.get(), row, "last");
    if (first == nullptr || last == nullptr)
        return std::nullopt;
    return StampRange{std::strtoll(first, nullptr, 10), std::strtoll(last, nullptr, 10)};
}

} // namespace kelo::tool
