#include "log_reader.h"

#include <algorithm>
#include <exception>
#include <limits>
#include <vector>

#include "errors.h"

namespace kelo::tool {
namespace {

using Log = _SYSLOG_LOG_DATA_tag;

constexpr uint64_t kChunkRows = 50000;
// A count comes as an int; no range of this many ids can exceed it.
constexpr uint64_t kCountableIds = std::numeric_limits<int32_t>::max();

// Carries the handler's exception over the library, and remembers where the walk stands.
struct Walker {
    const LogHandler &handle;
    uint64_t rows = 0;
    uint64_t lastId = 0;
    std::exception_ptr exception = nullptr;

    static int Take(Log &log, void *context) {
        auto &walker = *static_cast<Walker *>(context);
        try {
            walker.handle(log);
        } catch (...) {
            walker.exception = std::current_exception();
            return 1;
        }
        ++walker.rows;
        walker.lastId = log.id;
        return 0;
    }
};

void AddRange(Conditions &conditions, const IdRange &range) {
    conditions.push_back({SYSLOG_ATTRI_ID, SYSLOG_OP_GE, std::to_string(range.first), {}});
    conditions.push_back({SYSLOG_ATTRI_ID, SYSLOG_OP_LE, std::to_string(range.last), {}});
}

} // namespace

LogReader::LogReader(LogSource source, Conditions conditions)
    : source_(std::move(source)), conditions_(std::move(conditions)) {}

// One statement. Returns the id of the last row that was handed out, 0 for none.
uint64_t LogReader::Select(Conditions conditions, const IdRange &range, bool oldestFirst,
                           _SYSLOG_SQL_LIMIT_tag limit, const LogHandler &handle) const {
    AddRange(conditions, range);
    _SYSLOG_SQL_ORDER_tag order{oldestFirst ? 1 : 0, SYSLOG_ATTRI_ID};
    Walker walker{handle};
    const int status = SyslogDBSelectByTable(source_.path, source_.table, conditions, &limit, &order,
                                             Walker::Take, &walker, false);
    if (walker.exception != nullptr)
        std::rethrow_exception(walker.exception);
    if (status != 0)
        throw DatabaseError(DescribeDatabaseProblem(source_));
    return walker.lastId;
}

uint64_t LogReader::IdFromNewest(uint64_t index) const {
    return Select(conditions_, {}, false, {1, index}, [](const Log &) {});
}

uint64_t LogReader::FirstId(const IdRange &range) const {
    return Select(conditions_, range, true, {1, 0}, [](const Log &) {});
}

uint64_t LogReader::Walk(const IdRange &range, bool oldestFirst, const Page &page,
                         const LogHandler &handle) const {
    IdRange rest = range;
    uint64_t offset = page.offset;
    uint64_t total = 0;
    while (rest.first <= rest.last) {
        const uint64_t wanted = page.limit == 0 ? kChunkRows : std::min(kChunkRows, page.limit - total);
        uint64_t rows = 0;
        const uint64_t lastId = Select(conditions_, rest, oldestFirst, {wanted, offset}, [&](const Log &log) {
            ++rows;
            handle(log);
        });
        total += rows;
        if (rows < wanted || total == page.limit)
            break;
        if (lastId < rest.first || lastId > rest.last) // not numbers that grow: the walk would never end
            throw DatabaseError("cannot read " + source_.path + ": the ids of table " + source_.table +
                                " are no row numbers");
        (oldestFirst ? rest.first : rest.last) = oldestFirst ? lastId + 1 : lastId - 1;
        offset = 0;
    }
    return total;
}

uint64_t LogReader::WalkPage(const Page &page, const LogHandler &handle) const {
    if (page.limit != 0 && page.limit <= kChunkRows) {
        std::vector<Log> logs;
        Walk({}, false, page, [&](const Log &log) { logs.push_back(log); });
        std::for_each(logs.rbegin(), logs.rend(), handle);
        return logs.size();
    }
    // Too many to keep: find where the page begins and ends, then walk forward.
    IdRange range;
    range.last = IdFromNewest(page.offset);
    if (range.last == 0)
        return 0;
    if (page.limit != 0)
        range.first = std::max<uint64_t>(IdFromNewest(page.offset + page.limit - 1), 1);
    return Walk(range, true, {}, handle);
}

uint64_t LogReader::CountIn(const IdRange *range) const {
    Conditions conditions = conditions_;
    if (range != nullptr)
        AddRange(conditions, *range);
    // Always true, and not the text for which the library would answer with the largest id.
    conditions.push_back({SYSLOG_ATTRI_MSG, SYSLOG_OP_RAW, "1", {}});
    const int count = SyslogDBSelectCountByTable(source_.path, source_.table, conditions, nullptr, nullptr);
    if (count < 0)
        throw DatabaseError(DescribeDatabaseProblem(source_));
    return static_cast<uint64_t>(count);
}

uint64_t LogReader::Count() const {
    const uint64_t newest = LogReader(source_, {}).IdFromNewest(0);
    if (newest <= kCountableIds)
        return CountIn(nullptr);
    uint64_t total = 0;
    for (uint64_t first = 1; first <= newest; first += kCountableIds) {
        const IdRange range{first, first + kCountableIds - 1};
        total += CountIn(&range);
    }
    return total;
}

} // namespace kelo::tool
