// Reads a log database through the library while somebody writes it: watch_rows DATABASE COUNT. Ends with 0
// as soon as the table holds COUNT rows, with 1 at the first answer that cannot be true or after two minutes.

#include <algorithm>
#include <chrono>
#include <cstdio>
#include <cstdlib>
#include <vector>

#include "kelosyslog/dbutil.h"

namespace {

using Ids = std::vector<uint64_t>;

int AppendId(_SYSLOG_LOG_DATA_tag &log, void *ids) {
    static_cast<Ids *>(ids)->push_back(log.id);
    return 0;
}

[[noreturn]] void Fail(const char *what, long long found) {
    std::fprintf(stderr, "watch_rows: %s: %lld\n", what, found);
    std::exit(1);
}

// Nothing is deleted, so the newest page holds consecutive ids and reaches at least the count seen before.
void CheckNewestPage(const std::string &database, int count) {
    Ids ids;
    _SYSLOG_SQL_LIMIT_tag page{50, 0};
    _SYSLOG_SQL_ORDER_tag newestFirst{0, SYSLOG_ATTRI_ID};
    if (SyslogDBSelect(database, {}, &page, &newestFirst, AppendId, &ids, false) != 0)
        Fail("select failed at row", count);
    if (ids.size() < static_cast<size_t>(std::min(count, 50)) || ids.size() > 50)
        Fail("rows of a page", static_cast<long long>(ids.size()));
    if (ids.empty() || ids.front() < static_cast<uint64_t>(count))
        Fail("the newest page is older than the count", count);
    for (size_t i = 1; i < ids.size(); ++i)
        if (ids[i] + 1 != ids[i - 1])
            Fail("gap in a page before id", static_cast<long long>(ids[i]));
}

} // namespace

int main(int argc, char **argv) {
    if (argc != 3)
        Fail("arguments", argc);
    const std::string database = argv[1];
    const int wanted = std::atoi(argv[2]);
    const std::list<_SYSLOG_SQL_COND_tag> everyHost{{SYSLOG_ATTRI_HOST, SYSLOG_OP_GLOB, "*", {}}};
    const auto deadline = std::chrono::steady_clock::now() + std::chrono::minutes(2);
    int before = 1;
    while (std::chrono::steady_clock::now() < deadline) {
        const int count = SyslogDBSelectCount(database, {}, nullptr, nullptr);
        if (count < before || count > wanted)
            Fail("count", count);
        CheckNewestPage(database, count);
        const int filtered = SyslogDBSelectCount(database, everyHost, nullptr, nullptr);
        if (filtered < count || filtered > wanted)
            Fail("filtered count", filtered);
        if (filtered == wanted)
            return 0;
        before = filtered;
    }
    Fail("rows after two minutes", before);
}
