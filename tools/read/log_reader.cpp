#include "read/log_reader.h"

#include <algorithm>
#include <exception>
#include <limits>
#include <vector>

#include "base/errors.h"
#include "keloplatform/cluster.h"
#include "read/read_only_query.h"

namespace kelo::tool {
namespace {

using Log = _SYSLOG_LOG_DATA_tag;

// Rows of one statement, some 3 MB, and the ids that it starts with.
constexpr uint64_t kChunkRows = 10000;
// The largest page that is stored in memory.
constexpr uint64_t kPageRows = kChunkRows;
// Ids that one statement looks at, at most: of sparse ids, such as those made from a time.
constexpr uint64_t kLargestSpan = uint64_t{1} << 60;
// The ids of a minute of a cluster, whose ids are times.
constexpr uint64_t kFirstSpanOfCluster = uint64_t{60} << KELODB_CLUSTER_BITS_BELOW_SECOND;
// A count comes as an int; no range of this many ids can exceed it.
constexpr uint64_t kCountableIds = std::numeric_limits<int32_t>::max();

// Carries the handler's exception through the library, and the position of the scan.
struct RowVisitor {
    const LogHandler &handle;
    uint64_t maxRows;
    uint64_t rows = 0;
    uint64_t lastId = 0;
    std::exception_ptr exception = nullptr;

    static int Take(Log &log, void *context) {
        auto &walker = *static_cast<RowVisitor *>(context);
        try {
            walker.handle(log);
        } catch (...) {
            walker.exception = std::current_exception();
            return 1;
        }
        ++walker.rows;
        walker.lastId = log.id;
        return walker.rows == walker.maxRows ? 1 : 0;
    }
};

} // namespace

void AddRange(Conditions &conditions, const IdRange &range) {
    conditions.push_back({SYSLOG_ATTRI_ID, SYSLOG_OP_GE, std::to_string(range.first), {}});
    conditions.push_back({SYSLOG_ATTRI_ID, SYSLOG_OP_LE, std::to_string(range.last), {}});
}

LogReader::LogReader(LogTable table, Conditions conditions)
    : table_(std::move(table)), conditions_(std::move(conditions)) {}

// One statement.
LogReader::Scanned LogReader::Select(const IdRange &range, bool oldestFirst, const Page &page,
                                     const LogHandler &handle) const {
    Conditions conditions = conditions_;
    AddRange(conditions, range);
    _SYSLOG_SQL_LIMIT_tag limit{page.limit, page.offset};
    _SYSLOG_SQL_ORDER_tag order{oldestFirst ? 1 : 0, SYSLOG_ATTRI_ID};
    RowVisitor walker{handle, page.limit};
    const int status = connection_ != nullptr
                           ? connection_->SelectByTable(table_.name, conditions, &limit, &order,
                                                        RowVisitor::Take, &walker, false)
                           : SyslogDBSelectByTable(table_.path, table_.name, conditions, &limit, &order,
                                                   RowVisitor::Take, &walker, false);
    if (walker.exception != nullptr)
        std::rethrow_exception(walker.exception);
    if (status != 0)
        throw DatabaseError(DescribeDatabaseProblem(table_));
    return {walker.rows, walker.lastId};
}

// The id of the first log of a page of one.
uint64_t LogReader::IdAt(const Page &page) const {
    return Select(page.range, page.fromOldest, page, [](const Log &) {}).lastId;
}

uint64_t LogReader::EndId(const IdRange &range, bool isFirst) const {
    if (range.first > range.last)
        return 0;
    const uint64_t id = Select(range, isFirst, {1, 0}, [](const Log &) {}).lastId;
    if (id != 0 && (id < range.first || id > range.last)) // a scan from one to the next would never end
        throw DatabaseError("cannot read " + table_.path + ": the ids of table " + table_.name +
                            " are no row numbers");
    return id;
}

uint64_t LogReader::Scan(const IdRange &range, bool oldestFirst, uint64_t limit, const LogHandler &handle,
                         const ChunkHandler &chunkDone) const {
    IdRange rest = range;
    const bool isCluster = KELODBIsCluster(table_.path.c_str()) != 0;
    uint64_t span = isCluster ? kFirstSpanOfCluster : kChunkRows;
    uint64_t total = 0;
    const auto moveTo = [&](uint64_t id) { (oldestFirst ? rest.first : rest.last) = id; };
    while (rest.first <= rest.last) {
        const uint64_t further = std::min(span - 1, rest.last - rest.first);
        const IdRange chunk =
            oldestFirst ? IdRange{rest.first, rest.first + further} : IdRange{rest.last - further, rest.last};
        const uint64_t maxRows = limit == 0 ? kChunkRows : std::min(kChunkRows, limit - total);
        const Scanned scanned = Select(chunk, oldestFirst, {maxRows, 0}, handle);
        chunkDone();
        total += scanned.rows;
        if (limit != 0 && total == limit)
            break;
        if (scanned.rows == maxRows) { // the rest of the range is still to come
            if (isCluster)             // which may look at all rows of a range, whatever the limit
                span = 2 * (oldestFirst ? scanned.lastId - chunk.first : chunk.last - scanned.lastId) +
                       kChunkRows;
            moveTo(oldestFirst ? scanned.lastId + 1 : scanned.lastId - 1);
            continue;
        }
        moveTo(oldestFirst ? chunk.last + 1 : chunk.first - 1);
        if (scanned.rows < kChunkRows / 4)
            span = std::min((isCluster ? 16 : 4) * span, kLargestSpan);
        if (scanned.rows > 0)
            continue;
        const uint64_t next = EndId(rest, oldestFirst); // over a gap, or to the next of rare matches
        if (next == 0)
            break;
        moveTo(next);
    }
    return total;
}

uint64_t LogReader::ReadPage(const Page &page, bool oldestFirst, const LogHandler &handle,
                             const ChunkHandler &chunkDone) const {
    if (page.limit != 0 && page.limit <= kPageRows) {
        std::vector<Log> logs;
        Select(page.range, page.fromOldest, page, [&](const Log &log) { logs.push_back(log); });
        if (oldestFirst != page.fromOldest)
            std::reverse(logs.begin(), logs.end());
        std::for_each(logs.begin(), logs.end(), handle);
        chunkDone();
        return logs.size();
    }
    const auto idAt = [&](uint64_t index) { return IdAt({1, index, page.range, page.fromOldest}); };
    const uint64_t near = idAt(page.offset);
    if (near == 0)
        return 0;
    IdRange rest = page.range;
    (page.fromOldest ? rest.first : rest.last) = near;
    if (oldestFirst == page.fromOldest)
        return Scan(rest, oldestFirst, page.limit, handle, chunkDone);
    // Too many to reverse in memory: find where the page ends and scan from there.
    if (const uint64_t far = page.limit == 0 ? 0 : idAt(page.offset + page.limit - 1); far != 0)
        (page.fromOldest ? rest.last : rest.first) = far;
    return Scan(rest, oldestFirst, 0, handle, chunkDone);
}

uint64_t LogReader::CountWith(Conditions conditions) const {
    // Always true, and not the text for which the library would return the largest id.
    conditions.push_back({SYSLOG_ATTRI_MSG, SYSLOG_OP_RAW, "1", {}});
    const int count =
        connection_ != nullptr
            ? connection_->SelectCountByTable(table_.name, conditions, nullptr, nullptr)
            : SyslogDBSelectCountByTable(table_.path, table_.name, conditions, nullptr, nullptr);
    if (count < 0)
        throw DatabaseError(DescribeDatabaseProblem(table_));
    return static_cast<uint64_t>(count);
}

uint64_t LogReader::CountIn(const IdRange &range) const {
    Conditions conditions = conditions_;
    AddRange(conditions, range);
    return CountWith(conditions);
}

// In one statement, with a number of 64 bits: the ids of a cluster are far apart, and its rows may be many.
uint64_t LogReader::CountOnCluster() const {
    std::string clause;
    if (LogSearchClauseGet(conditions_, clause) != 0)
        throw DatabaseError(DescribeDatabaseProblem(table_));
    const std::string where = clause.empty() ? "" : " WHERE " + clause;
    return static_cast<uint64_t>(
        ReadOnlyQuery(table_).Number("SELECT count(*) AS value FROM " + table_.name + where));
}

uint64_t LogReader::Count() const {
    if (KELODBIsCluster(table_.path.c_str()) != 0)
        return CountOnCluster();
    SyslogDBReader connection(table_.path);
    LogReader everything(table_, {});
    LogReader selected(table_, conditions_);
    everything.connection_ = selected.connection_ = &connection;
    const uint64_t newest = everything.IdFromNewest(0);
    if (newest <= kCountableIds)
        return selected.CountWith(conditions_);
    uint64_t total = 0;
    for (uint64_t next = everything.FirstId({}); next != 0 && next <= newest;) {
        const IdRange range{next, next + kCountableIds - 1};
        total += selected.CountIn(range);
        next = everything.FirstId({range.last + 1, newest});
    }
    return total;
}

} // namespace kelo::tool
