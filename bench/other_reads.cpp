// Reads other than by keyword that take another way than SQLite's own: pages of old days, values of a column,
// counts and pages of a severity. Against the same statement as SQLite runs it, and against the newest page.
//
//   bench_other_reads [ROWS]      1,000,000 unless given

#include <algorithm>
#include <cstdio>
#include <cstdlib>
#include <functional>
#include <list>
#include <string>

#include "keloplatform/skip_index.h"
#include "kelosyslog/dbutil.h"
#include "real_text.h"
#include "support/measure.h"

using namespace kelo::bench;

namespace {

constexpr int kRounds = 9;
constexpr int kFullSize = 5'000'000; // the rows for which the bounds are meant

using Conditions = std::list<_SYSLOG_SQL_COND_tag>;

int Count(_SYSLOG_LOG_DATA_tag &log, void *sum) {
    *static_cast<uint64_t *>(sum) += log.id;
    return 0;
}

// The sum of the ids on the newest page.
uint64_t Page(const std::string &database, const Conditions &conditions) {
    _SYSLOG_SQL_LIMIT_tag page{50, 0};
    _SYSLOG_SQL_ORDER_tag newestFirst{0, SYSLOG_ATTRI_ID};
    uint64_t sum = 0;
    if (SyslogDBSelect(database, conditions, &page, &newestFirst, Count, &sum, false) != 0)
        Fail("no page of " + database);
    return sum;
}

Conditions Days(const char *from, const char *to) {
    Conditions conditions;
    LogSearchCondListGen("", "", "", "", "", from, to, conditions);
    return conditions;
}

Conditions Seconds(int64_t from, int64_t to) {
    return {{SYSLOG_ATTRI_UTCSEC, SYSLOG_OP_GE, std::to_string(from), {}},
            {SYSLOG_ATTRI_UTCSEC, SYSLOG_OP_LE, std::to_string(to), {}}};
}

Conditions Severities(const char *values) {
    Conditions conditions;
    LogSearchCondListGen("", values, "", "", "", "", "", conditions);
    return conditions;
}

uint64_t CountOf(const std::string &database, const Conditions &conditions) {
    return static_cast<uint64_t>(SyslogDBSelectCount(database, conditions, nullptr, nullptr));
}

uint64_t ValuesOf(const std::string &database, const char *column) {
    std::list<std::string> values;
    if (SyslogDBAttriValueGet(database, column, nullptr, values) != 0)
        Fail("no values of " + database);
    return values.size();
}

struct Read {
    const char *name;
    std::function<uint64_t()> run;
    double atMostOfScan;
    double atMostOfNewestPage; // 0: no bound
    const char *reason = "";   // why it is not 20 times as fast
};

uint64_t WithoutIndex(const Read &read) {
    setenv("KELO_SKIP_INDEX", "off", 1);
    const uint64_t result = read.run();
    unsetenv("KELO_SKIP_INDEX");
    return result;
}

} // namespace

int main(int argc, char **argv) {
    const int rows = argc > 1 ? std::atoi(argv[1]) : 1'000'000;
    const std::string database = RealTextDatabase(rows);
    if (KELODBSkipIndexBuild(database.c_str(), 0) != KELODB_SKIP_COMPLETE)
        Fail("no index for " + database);
    constexpr int64_t kFirst = 1'577'836'800; // 2020/01/01
    const Read reads[] = {
        {"page of three old days", [&] { return Page(database, Days("2020/01/01", "2020/01/03")); }, 0.05, 5},
        {"page of an old hour", [&] { return Page(database, Seconds(kFirst + 80'000, kFirst + 83'600)); },
         0.2, 5,
         "SQLite takes the hour from its index of utcsec and sorts 12,000 records. A twentieth of that would "
         "be the time of the newest page."},
        {"page up to an old second", [&] { return Page(database, Seconds(0, kFirst + 80'000)); }, 0.05, 5},
        {"values of host", [&] { return ValuesOf(database, "host"); }, 0.05, 20},
        {"values of prog", [&] { return ValuesOf(database, "prog"); }, 0.05, 20},
        {"count of a rare severity", [&] { return CountOf(database, Severities("emerg")); }, 0.05, 0},
        {"page of an absent severity", [&] { return Page(database, Severities("alert")); }, 0.05, 0},
        {"count of a severity of every fortieth",
         [&] { return CountOf(database, Severities("emerg,alert,crit,err")); }, 1.05, 0,
         "Of one record in forty, more than half of the blocks of 32 records have one, so all are read."},
        {"count of the usual severity", [&] { return CountOf(database, Severities("info")); }, 1.05, 0},
    };
    bool allKept = true;
    const double scale = static_cast<double>(kFullSize) / std::min(rows, kFullSize);
    PrintHeading("Other reads in " + std::to_string(rows) + " rows", "ms");
    for (const Read &read : reads) {
        if (read.run() != WithoutIndex(read))
            Fail(std::string(read.name) + ": another result than SQLite's");
        const auto times = MedianTimes({{"ours", [&] { return Time([&] { read.run(); }); }},
                                        {"SQLite", [&] { return Time([&] { WithoutIndex(read); }); }},
                                        {"page", [&] { return Time([&] { Page(database, {}); }); }}},
                                       kRounds);
        const double atMost = read.atMostOfScan < 0.5 ? read.atMostOfScan * scale : read.atMostOfScan;
        allKept = PrintRatio(read.name, times[0], "as SQLite runs it", times[1], atMost) && allKept;
        if (read.atMostOfNewestPage != 0)
            allKept =
                PrintRatio(read.name, times[0], "newest page", times[2], read.atMostOfNewestPage) && allKept;
    }
    for (const Read &read : reads) {
        if (*read.reason != '\0')
            std::printf("\n%s: %s\n", read.name, read.reason);
    }
    return allKept ? 0 : 1;
}
