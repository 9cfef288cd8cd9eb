// A page of the newest logs and the count of all, in a large log against a small one.

#include <string>
#include <vector>

#include "kelosyslog/dbutil.h"
#include "support/log_database.h"
#include "support/measure.h"

using namespace kelo::bench;

namespace {

constexpr int kLarge = 1000000;
constexpr int kSmall = 1000;
constexpr int kRounds = 25;
constexpr int kCalls = 40; // a sample is the mean of this many calls

int CountRow(_SYSLOG_LOG_DATA_tag &, void *context) {
    ++*static_cast<int *>(context);
    return 0;
}

void ReadPage(const std::string &path, uint64_t offset) {
    _SYSLOG_SQL_LIMIT_tag page{50, offset};
    _SYSLOG_SQL_ORDER_tag newestFirst{0, SYSLOG_ATTRI_ID};
    int rows = 0;
    if (SyslogDBSelect(path, {}, &page, &newestFirst, CountRow, &rows, false) != 0 || rows != 50)
        Fail("no page of 50 rows in " + path);
}

void CountAll(const std::string &path, int rows) {
    if (SyslogDBSelectCount(path, {}, nullptr, nullptr) != rows)
        Fail("wrong count of " + path);
}

Variant Repeated(const std::string &name, const std::function<void()> &work) {
    return {name, [work] {
                return Time([&] {
                           for (int call = 0; call < kCalls; ++call)
                               work();
                       }) /
                       kCalls;
            }};
}

} // namespace

int main() {
    const std::string large = LogDatabase(kLarge);
    const std::string small = LogDatabase(kSmall);
    const auto times = MedianTimes({Repeated("small page", [&] { ReadPage(small, 0); }),
                                    Repeated("large page", [&] { ReadPage(large, 0); }),
                                    Repeated("deep page", [&] { ReadPage(large, 900000); }),
                                    Repeated("small count", [&] { CountAll(small, kSmall); }),
                                    Repeated("large count", [&] { CountAll(large, kLarge); })},
                                   kRounds);
    PrintHeading("Unfiltered pages of 50 rows and counts, 1000000 rows against 1000", "ms");
    bool allKept = PrintRatio("page at offset 0", times[1], "page at offset 0 of 1000", times[0], 2);
    allKept =
        PrintRatio("page at offset 900000", times[2], "page at offset 0 of 1000", times[0], 2) && allKept;
    allKept = PrintRatio("count", times[4], "count of 1000", times[3], 1.5) && allKept;
    return allKept ? 0 : 1;
}
