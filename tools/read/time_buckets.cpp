#include "read/time_buckets.h"

#include <algorithm>
#include <ctime>

#include "base/errors.h"

namespace kelo::tool {
namespace {

constexpr int64_t kMinute = 60;
constexpr int64_t kHour = 60 * kMinute;
constexpr int64_t kDay = 24 * kHour;
constexpr int64_t kWeek = 7 * kDay;
// Each divides the next, so that buckets can be joined.
constexpr int64_t kSpans[] = {
    1,     5,         15,        30,         kMinute, 5 * kMinute, 15 * kMinute, 30 * kMinute,
    kHour, 3 * kHour, 6 * kHour, 12 * kHour, kDay,    kWeek};
constexpr int64_t kMostBuckets = 100'000;

int64_t NextSpan(int64_t span) {
    const auto *next = std::upper_bound(std::begin(kSpans), std::end(kSpans), span);
    return next != std::end(kSpans) ? *next : 2 * span;
}

// Where a bucket begins, at a time near the epoch.
int64_t OriginOf(int64_t span, int64_t time) {
    constexpr int64_t kMonday = 4 * kDay; // the epoch was a Thursday
    const time_t moment = time;
    tm local{};
    const int64_t offset = localtime_r(&moment, &local) != nullptr ? local.tm_gmtoff : 0;
    return (span % kWeek == 0 ? kMonday : 0) - offset;
}

int64_t FloorDivide(int64_t number, int64_t divisor) {
    return number / divisor - (number % divisor < 0 ? 1 : 0);
}

// The numbers of the first and the last bucket.
struct Ends {
    int64_t first;
    int64_t last;
    uint64_t Count() const { return static_cast<uint64_t>(last - first) + 1; }
};

// The bucket numbers of a period.
Ends EndsOf(const Ends &seconds, int64_t origin, int64_t span) {
    return {FloorDivide(seconds.first - origin, span), FloorDivide(seconds.last - origin, span)};
}

std::optional<int64_t> TimeOfEnd(const LogReader &reader, bool isOldest) {
    std::optional<int64_t> time;
    reader.ReadPage({1, 0, {}, isOldest}, isOldest, [&](const _SYSLOG_LOG_DATA_tag &log) {
        time = std::clamp(log.utcsec, -kFarthestTime, kFarthestTime);
    });
    return time;
}

// The seconds of the period; nothing if it has an end without records.
std::optional<Ends> SecondsOf(const LogTable &table, const Conditions &conditions,
                              const BucketPeriod &period) {
    const LogReader reader(table, conditions);
    const auto first = period.since ? period.since : TimeOfEnd(reader, true);
    const auto last = period.until ? period.until : TimeOfEnd(reader, false);
    return first && last ? std::optional(Ends{*first, std::max(*first, *last)}) : std::nullopt;
}

void RequireFew(const Ends &ends, int64_t span) {
    if (ends.Count() > kMostBuckets)
        throw UsageError("--by: " + std::to_string(ends.Count()) + " spans of " + std::to_string(span) +
                         " seconds are more than " + std::to_string(kMostBuckets) +
                         "; choose a longer one, or --since and --until");
}

} // namespace

TimeBuckets CountByTime(const LogTable &table, const Conditions &conditions, const BucketPeriod &period,
                        const BucketSize &size) {
    TimeBuckets result;
    const std::optional<Ends> seconds = SecondsOf(table, conditions, period);
    if (!seconds)
        return result;
    result.span = size.span != 0 ? size.span : kSpans[0];
    int64_t origin = OriginOf(result.span, seconds->first);
    const auto isTooMany = [&](const Ends &ends) { return size.span == 0 && ends.Count() > size.most; };
    while (isTooMany(EndsOf(*seconds, origin, result.span))) {
        result.span = NextSpan(result.span);
        origin = OriginOf(result.span, seconds->first);
    }
    Ends ends = EndsOf(*seconds, origin, result.span);
    RequireFew(ends, result.span);

    const TimeTally tally = TallyByTime(table, conditions, origin, result.span);
    result.total = tally.total;
    result.untimed = tally.untimed;
    if (!tally.spans.empty())
        ends = {std::min(ends.first, tally.spans.begin()->first),
                std::max(ends.last, tally.spans.rbegin()->first)};
    const int64_t countedSpan = result.span;
    const int64_t countedOrigin = origin;
    const auto timeOf = [&](int64_t number) { return countedOrigin + number * countedSpan; };
    const Ends counted = {timeOf(ends.first), timeOf(ends.last)};
    while (isTooMany(ends)) {
        result.span = NextSpan(result.span);
        origin = OriginOf(result.span, seconds->first);
        ends = EndsOf(counted, origin, result.span);
    }
    RequireFew(ends, result.span);
    result.first = origin + ends.first * result.span;
    result.buckets.resize(ends.Count());
    for (const auto &[number, counts] : tally.spans)
        result.buckets[static_cast<size_t>((timeOf(number) - result.first) / result.span)].Add(counts);
    return result;
}

} // namespace kelo::tool
