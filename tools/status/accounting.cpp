#include "status/accounting.h"

#include <algorithm>
#include <limits>

#include "kelosyslog/dbutil.h"
#include "read/accounting_samples.h"
#include "read/eps_series.h"
#include "read/read_only_query.h"

namespace kelo::tool {
namespace {

// Records a second in the `seconds` that end with `newest`.
double MeanRate(const std::string &path, int64_t newest, int64_t seconds) {
    int64_t logs = 0;
    ReadEps(path, newest - seconds + 1, newest, [&](const SYSLOG_LOG_EPS &sample) { logs += sample.eps; });
    return static_cast<double>(logs) / static_cast<double>(seconds);
}

} // namespace

AccountingStatus GatherAccounting(const std::string &path, int devices) {
    // Keeps the library's connections from being the last to close, so that none of them has to clean up.
    const ReadOnlyQuery open({path, "eps"}, std::chrono::milliseconds(150));
    AccountingStatus status;
    if (const auto stored = StoredStamps(path, {0, std::numeric_limits<int32_t>::max()})) {
        status.newest = stored->last;
        status.perSecond = MeanRate(path, status.newest, 60);
        status.perSecondHour = MeanRate(path, status.newest, 3600);
    }
    RequireHistogram(path);
    status.total = SyslogDBHistTotalGet(path);
    for (const auto &device : SyslogDBHistGet(path, devices))
        status.devices.push_back(device);
    std::stable_sort(status.devices.begin(), status.devices.end(),
                     [](const auto &one, const auto &other) { return one.second > other.second; });
    return status;
}

} // namespace kelo::tool
