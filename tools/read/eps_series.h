#pragma once

#include <cstdint>
#include <functional>
#include <map>
#include <optional>
#include <string>

#include "kelosyslog/dbutil.h"

namespace kelo::tool {

// The length of an interval in seconds.
enum class EpsInterval : int32_t { Second = 1, Minute = 60, Hour = 3600 };

// The interval of this name ("second", "minute", "hour"). Throws UsageError naming --by.
EpsInterval ParseEpsInterval(const std::string &name);

// The records that were received in one interval.
struct EpsBucket {
    uint64_t logs = 0;
    uint64_t peak = 0;                       // of the largest sample
    std::map<std::string, uint64_t> devices; // the same by sending device
};

// Sums of samples over intervals: the data of tables and plots of events per second.
//
//     EpsSeries series(EpsInterval::Minute);
//     ReadEps(path, since, until, [&](const SYSLOG_LOG_EPS &sample) { series.Add(sample); });
//     for (const auto &[start, bucket] : series.Buckets())
//         Draw(start, series.PerSecond(bucket.logs));
//
// A sample belongs to the interval of its stamp, which is the second in which it was closed: the records of a
// second are usually counted in the next one, and those before a quiet period in the second after it.
class EpsSeries {
public:
    // `device`: count only the records of this device.
    explicit EpsSeries(EpsInterval interval, std::optional<std::string> device = std::nullopt)
        : interval_(interval), device_(std::move(device)) {}

    void Add(const SYSLOG_LOG_EPS &sample);

    // The intervals with records, by the second of their beginning (since the epoch). Minutes and hours begin
    // as on a clock in the time zone of the process.
    const std::map<int64_t, EpsBucket> &Buckets() const { return buckets_; }

    int64_t Seconds() const { return static_cast<int64_t>(interval_); }
    // The mean rate of an interval with so many records.
    double PerSecond(uint64_t logs) const {
        return static_cast<double>(logs) / static_cast<double>(Seconds());
    }

    // The beginning of the interval of a second.
    int64_t StartOf(int64_t stamp) const;

private:
    EpsInterval interval_;
    std::optional<std::string> device_;
    std::map<int64_t, EpsBucket> buckets_;
};

using EpsHandler = std::function<void(const SYSLOG_LOG_EPS &)>;

// Passes the samples with stamps from `since` to `until` (seconds since the epoch) of an accounting database
// to `handle`, oldest first. They are read a day at a time, so that the memory in use does not grow with the
// samples. Stamps beyond 32 bits are not read. Throws DatabaseError.
void ReadEps(const std::string &path, int64_t since, int64_t until, const EpsHandler &handle);

} // namespace kelo::tool
