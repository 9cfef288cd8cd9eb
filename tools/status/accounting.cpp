#include "status/accounting.h"

#include <limits>

#include "base/number_text.h"
#include "read/read_only_query.h"

namespace kelo::tool {
namespace {

// For each statement; the sum of a million devices takes a tenth of it.
constexpr std::chrono::milliseconds kPatience{2000};
constexpr size_t kLongestName = 255; // bytes that are shown of a device's name

// Records a second in the `seconds` that end with `newest`.
double MeanRate(const ReadOnlyQuery &database, int64_t newest, int64_t seconds) {
    const int64_t logs =
        database.Number("SELECT total(eps) AS value FROM eps WHERE stamp BETWEEN " +
                        std::to_string(newest - seconds + 1) + " AND " + std::to_string(newest));
    return static_cast<double>(logs) / static_cast<double>(seconds);
}

} // namespace

AccountingStatus GatherAccounting(const std::string &path, int devices) {
    const ReadOnlyQuery database({path, "histogram"}, kPatience);
    database.RequireTable();
    AccountingStatus status;
    const auto newest = database.FirstRow("SELECT max(stamp) AS newest FROM eps WHERE stamp BETWEEN 0 AND " +
                                              std::to_string(std::numeric_limits<int32_t>::max()),
                                          {"newest"});
    if (newest && !newest->front().empty()) {
        status.newest = SignedNumber(newest->front());
        status.perSecond = MeanRate(database, status.newest, 60);
        status.perSecondHour = MeanRate(database, status.newest, 3600);
    }
    status.total =
        UnsignedNumber(database.FirstRow("SELECT sum(count) AS total FROM histogram", {"total"})->front());
    for (const auto &row :
         database.Rows("SELECT substr(device, 1, " + std::to_string(kLongestName) +
                           ") AS device, count FROM histogram ORDER BY count DESC, device LIMIT " +
                           std::to_string(devices),
                       {"device", "count"}))
        status.devices.emplace_back(row[0], UnsignedNumber(row[1]));
    return status;
}

} // namespace kelo::tool
