#include "cluster/block_transfer.h"

#include <algorithm>
#include <chrono>
#include <thread>
#include <unordered_map>

#include "base/number_text.h"

namespace kelo::tool {
namespace {

constexpr int kBlockAttempts = 3;
// Days of one INSERT: each becomes a part of its own, and later versions refuse more than 100.
constexpr size_t kMostDays = 50;
constexpr int64_t kDaySec = 86400;
constexpr std::chrono::milliseconds kPause{50};
constexpr std::chrono::minutes kLongestInsert{10};
constexpr char kInsert[] = "INSERT INTO logs_shard (";

int64_t DayOf(const EngineRow &row) {
    return row.second / kDaySec;
}

} // namespace

// The rows of a block, and where the cluster has them.
struct BlockTransfer::Expected {
    Expected(std::span<const EngineRow> block, unsigned int node) : rows(block) {
        uint64_t first = UINT64_MAX;
        uint64_t last = 0;
        for (const EngineRow &row : rows) {
            const uint64_t id = EngineId(row, node);
            first = std::min(first, id);
            last = std::max(last, id);
            sum += HashOf(row) * id;
        }
        const auto number = [](uint64_t value) { return std::to_string(value); };
        where = " FROM logs WHERE id >= " + number(first) + " AND id <= " + number(last) +
                " AND node = " + number(node) + " AND rcptid % " + number(kMessageMask + 1) +
                " >= " + number(rows.front().source & kMessageMask) + " AND rcptid % " +
                number(kMessageMask + 1) + " <= " + number(rows.back().source & kMessageMask);
        isOfBlock =
            "rcptid >= " + number(rows.front().source) + " AND rcptid <= " + number(rows.back().source);
    }

    std::span<const EngineRow> rows;
    uint64_t sum = 0;      // of the products of checksum and id, modulo 2^64
    std::string where;     // rows of the cluster, all that can have one of the ids among them
    std::string isOfBlock; // they come from the block
};

void BlockTransfer::AwaitInserts(size_t server) {
    const auto end = std::chrono::steady_clock::now() + kLongestInsert;
    // Not a text that this statement has in itself.
    const std::string sql =
        "SELECT count() FROM system.processes WHERE position(query, concat('INSERT INTO ', "
        "'logs_shard (')) > 0 AND position(query, 'RowBinary') > 0";
    while (servers_.AskNumbers(server, sql, 1).front() != 0) {
        if (std::chrono::steady_clock::now() > end)
            throw DatabaseError(servers_.Url(server) + " works on an INSERT for more than 10 minutes");
        std::this_thread::sleep_for(kPause);
    }
}

void BlockTransfer::AwaitOthers() {
    for (size_t server = 0; server < servers_.Count(); ++server)
        AwaitInserts(server);
}

uint64_t BlockTransfer::Store(size_t server, std::span<const EngineRow> rows) {
    if (rows.empty())
        return 0;
    const Expected expected(rows, node_);
    uint64_t sent = 0;
    std::string problem;
    for (int attempt = 0; attempt <= kBlockAttempts; ++attempt) {
        const std::vector<const EngineRow *> missing = Missing(server, expected);
        if (missing.empty())
            return sent;
        if (attempt == kBlockAttempts)
            break;
        try {
            Send(server, missing);
            sent += missing.size();
        } catch (const DatabaseError &error) { // it may have been stored nevertheless
            problem = error.what();
            AwaitInserts(server);
        }
    }
    throw DatabaseError(problem.empty()
                            ? servers_.Url(server) + " has accepted rows from id " +
                                  std::to_string(rows.front().source) + " on and does not have them"
                            : problem);
}

std::vector<const EngineRow *> BlockTransfer::Missing(size_t server, const Expected &expected) {
    const std::vector<uint64_t> found = servers_.AskNumbers(
        server,
        "SELECT countIf(" + expected.isOfBlock + "), sumIf(" + HashExpression() + " * id, " +
            expected.isOfBlock + "), countIf(NOT (" + expected.isOfBlock + "))" + expected.where,
        3);
    const bool hasOthers = found[2] != 0;
    if (!hasOthers && found[0] == expected.rows.size() && found[1] == expected.sum)
        return {};
    if (hasOthers || found[0] != 0)
        return MissingOneByOne(server, expected);
    std::vector<const EngineRow *> all;
    for (const EngineRow &row : expected.rows)
        all.push_back(&row);
    return all;
}

std::vector<const EngineRow *> BlockTransfer::MissingOneByOne(size_t server, const Expected &expected) {
    std::unordered_map<uint64_t, uint64_t> hashes; // by id
    for (const auto &row : servers_.Ask(server, "SELECT id, " + HashExpression() + expected.where)) {
        const uint64_t id = UnsignedNumber(row.at(0));
        const uint64_t hash = UnsignedNumber(row.at(1));
        if (!hashes.emplace(id, hash).second)
            throw DatabaseError(servers_.Url(server) + ": the cluster has two rows with the id " +
                                std::to_string(id) + "; a server merges equal rows of its own, later");
    }
    std::vector<const EngineRow *> missing;
    for (const EngineRow &row : expected.rows) {
        const uint64_t id = EngineId(row, node_);
        const auto [found, isNew] = hashes.emplace(id, HashOf(row));
        if (isNew)
            missing.push_back(&row);
        else if (found->second != HashOf(row))
            throw DatabaseError("row " + std::to_string(row.source) + ": another row has its id " +
                                std::to_string(id) + " in the cluster; has number " + std::to_string(node_) +
                                " been given to another log?");
    }
    return missing;
}

void BlockTransfer::Send(size_t server, std::vector<const EngineRow *> rows) {
    std::stable_sort(rows.begin(), rows.end(),
                     [](const EngineRow *a, const EngineRow *b) { return DayOf(*a) < DayOf(*b); });
    const std::string start = kInsert + EngineColumns() + ", node, rcptid) FORMAT RowBinary\n";
    std::string statement = start;
    size_t days = 0;
    for (size_t i = 0; i < rows.size(); ++i) {
        days += i == 0 || DayOf(*rows[i]) != DayOf(*rows[i - 1]) ? 1 : 0;
        if (days > kMostDays) {
            servers_.Run(server, statement);
            statement = start;
            days = 1;
        }
        AppendRow(*rows[i], statement);
        statement += static_cast<char>(node_);
        for (size_t byte = 0; byte < sizeof rows[i]->source; ++byte)
            statement += static_cast<char>(rows[i]->source >> 8 * byte);
    }
    servers_.Run(server, statement);
}

} // namespace kelo::tool
