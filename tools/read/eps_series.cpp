#include "read/eps_series.h"

#include <algorithm>
#include <ctime>
#include <limits>

#include "base/errors.h"
#include "read/accounting_samples.h"
#include "read/log_table.h"

namespace kelo::tool {

EpsInterval ParseEpsInterval(const std::string &name) {
    if (name == "second")
        return EpsInterval::Second;
    if (name == "minute")
        return EpsInterval::Minute;
    if (name == "hour")
        return EpsInterval::Hour;
    throw UsageError("--by: '" + name + "' is none of second, minute, hour");
}

void EpsSeries::Add(const SYSLOG_LOG_EPS &sample) {
    if (!device_) {
        EpsBucket &bucket = buckets_[StartOf(sample.stamp)];
        const auto logs = static_cast<uint64_t>(std::max<int64_t>(sample.eps, 0));
        bucket.logs += logs;
        bucket.peak = std::max(bucket.peak, logs);
        for (const auto &[device, count] : sample.devices)
            bucket.devices[device] += static_cast<uint64_t>(std::max(count, 0));
        return;
    }
    const auto found = sample.devices.find(*device_);
    if (found == sample.devices.end())
        return;
    EpsBucket &bucket = buckets_[StartOf(sample.stamp)];
    const auto logs = static_cast<uint64_t>(std::max(found->second, 0));
    bucket.logs += logs;
    bucket.peak = std::max(bucket.peak, logs);
    bucket.devices[*device_] += logs;
}

int64_t EpsSeries::StartOf(int64_t stamp) const {
    if (interval_ == EpsInterval::Second)
        return stamp;
    const time_t moment = stamp;
    tm local{};
    const int64_t offset = localtime_r(&moment, &local) != nullptr ? local.tm_gmtoff : 0;
    const int64_t into = (stamp + offset) % Seconds();
    return stamp - (into < 0 ? into + Seconds() : into);
}

void ReadEps(const std::string &path, int64_t since, int64_t until, const EpsHandler &handle) {
    constexpr int64_t kDay = 24 * 60 * 60;
    constexpr int64_t kLastStamp = std::numeric_limits<int32_t>::max();
    const StampRange asked = {std::max<int64_t>(since, 0), std::min(until, kLastStamp)};
    const std::optional<StampRange> stored = StoredStamps(path, asked);
    if (!stored)
        return;
    for (int64_t from = stored->first; from <= stored->last; from += kDay) {
        const int64_t to = std::min(stored->last, from + kDay - 1);
        const auto samples = SyslogDBEpsGet(path, static_cast<int>(from), static_cast<int>(to));
        // A failure also gives no samples.
        if (samples.empty() && StoredStamps(path, {from, to}))
            throw DatabaseError(DescribeDatabaseProblem({path, "eps"}));
        for (const auto &[stamp, sample] : samples)
            handle(sample);
    }
}

} // namespace kelo::tool
