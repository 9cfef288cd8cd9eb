#include <algorithm>
#include <charconv>
#include <cstdlib>
#include <cstring>
#include <limits>

#include "common/db_field.h"
#include "kelosyslog/utils.h"
#include "query/statement.h"

using namespace kelo;

namespace {

// The text widens the number with its sign, so that a negative one becomes huge.
std::string WidenedText(int number) {
    return ullNumberToString(static_cast<unsigned long long>(number));
}

uint64_t UnsignedField(DBResult_tag *result, uint32_t row, const char *column) {
    return std::strtoull(FieldText(result, row, column), nullptr, 10);
}

// Saturates at the ends of 32 bits.
int32_t Int32Field(DBResult_tag *result, uint32_t row, const char *column) {
    using Limits = std::numeric_limits<int32_t>;
    const char *text = FieldText(result, row, column);
    const char *end = text + std::strlen(text);
    int32_t plain = 0; // nearly all are plain digits, which are read in a fraction of the time
    if (const auto [stop, error] = std::from_chars(text, end, plain); error == std::errc() && stop == end)
        return plain;
    const long long number = std::strtoll(text, nullptr, 10);
    return static_cast<int32_t>(std::clamp<long long>(number, Limits::min(), Limits::max()));
}

// A number in the first row of a statement's answer; 0 on failure.
uint64_t AskNumber(const std::string &dbPath, const std::string &sql, const char *column) {
    const Answer answer = Ask(dbPath, sql);
    uint32_t row = 0;
    if (!answer.isGood || !FetchOrFail(answer.result.get(), dbPath, row))
        return 0;
    return UnsignedField(answer.result.get(), row, column);
}

using Samples = std::map<int, SYSLOG_LOG_EPS>;

// The sample of a stamp. The accounting manager writes stamps in ascending order, so the last one is checked
// first.
SYSLOG_LOG_EPS &SampleOf(Samples &samples, int32_t stamp) {
    if (!samples.empty() && samples.rbegin()->first == stamp)
        return samples.rbegin()->second;
    SYSLOG_LOG_EPS &sample = samples.try_emplace(samples.end(), stamp)->second;
    sample.stamp = stamp;
    return sample;
}

// Adds a row to the sample of its stamp. The devices of a sample, too, come in ascending order.
void AddEpsRow(DBResult_tag *result, uint32_t row, Samples &samples) {
    SYSLOG_LOG_EPS &sample = SampleOf(samples, Int32Field(result, row, "stamp"));
    const int32_t eps = Int32Field(result, row, "eps");
    // The total takes every row, the devices only the first of each name.
    sample.eps += eps;
    sample.devices.try_emplace(sample.devices.end(), FieldText(result, row, "device"), eps);
}

} // namespace

uint64_t SyslogDBHistTotalGet(const std::string &dbPath) {
    if (!CheckDbPath(dbPath, 1061))
        return 0;
    return AskNumber(dbPath, "SELECT SUM(count) FROM histogram", "SUM(count)");
}

uint64_t SyslogDBHistGetSingle(const std::string &dbPath, std::string device) {
    if (!CheckDbPath(dbPath, 1102))
        return 0;
    return AskNumber(dbPath, "SELECT * FROM histogram WHERE device = '" + device + "'", "count");
}

std::map<std::string, uint64_t> SyslogDBHistGet(const std::string &dbPath, int top) {
    if (!CheckDbPath(dbPath, 1144))
        return {};
    std::string sql = "SELECT * FROM histogram";
    if (top != 0)
        sql += " ORDER BY count DESC LIMIT " + WidenedText(top);
    std::map<std::string, uint64_t> counts;
    const bool isComplete = AskRows(dbPath, sql, nullptr, [&](DBResult_tag *result, uint32_t row) {
        counts.emplace(FieldText(result, row, "device"), UnsignedField(result, row, "count"));
    });
    if (!isComplete)
        counts.clear();
    return counts;
}

std::map<int, SYSLOG_LOG_EPS> SyslogDBEpsGet(const std::string &dbPath, int from, int to) {
    if (!CheckDbPath(dbPath, 992))
        return {};
    const std::string sql =
        "SELECT * FROM eps WHERE stamp >=" + WidenedText(from) + " and stamp <=" + WidenedText(to);
    Samples samples;
    const bool isComplete = AskRows(
        dbPath, sql, nullptr, [&](DBResult_tag *result, uint32_t row) { AddEpsRow(result, row, samples); });
    if (!isComplete)
        samples.clear();
    return samples;
}
