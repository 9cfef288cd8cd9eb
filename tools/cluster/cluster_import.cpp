#include "cluster/cluster_import.h"

#include <sqlite3.h>

#include <filesystem>
#include <vector>

#include "base/sqlite.h"
#include "base/stop_signals.h"
#include "cluster/block_transfer.h"

namespace kelo::tool {
namespace {

// A block is read, compared and sent as a whole.
constexpr size_t kBlockRows = 50'000;
constexpr size_t kBlockBytes = 16 << 20;
constexpr int64_t kHourSec = 3600;

// Reads the rows up to an id in blocks, each with a statement of its own: writers of the database wait for
// none.
class BlockReader {
public:
    BlockReader(SqliteConnection &database, ClusterImportResult &result)
        : database_(database), result_(result), last_(database.Number("SELECT max(id) FROM logs")),
          next_(database.Number("SELECT min(id) FROM logs")),
          hasEnded_(database.Number("SELECT EXISTS (SELECT 1 FROM logs)") == 0) {
        std::string nulls;
        for (const char *column : kEngineColumns)
            nulls.append(nulls.empty() ? "(" : " + (").append(column).append(" IS NULL)");
        sql_ =
            "SELECT id, " + EngineColumns() + ", " + nulls +
            ", typeof(utcsec) NOT IN ('integer', 'null') FROM logs WHERE id >= ?1 AND id <= ?2 ORDER BY id";
    }

    uint64_t IdsBehind() const {
        return hasEnded_ ? 0 : static_cast<uint64_t>(last_) - static_cast<uint64_t>(next_) + 1;
    }

    // Rows whose ids agree above kMessageMask; none at the end.
    std::vector<EngineRow> Read() {
        std::vector<EngineRow> rows;
        size_t bytes = 0;
        while (rows.empty() && !hasEnded_) {
            SqliteStatement statement(database_, sql_);
            statement.Bind(1, next_);
            statement.Bind(2, std::min(last_, next_ | static_cast<int64_t>(kMessageMask)));
            while (rows.size() < kBlockRows && bytes < kBlockBytes && statement.Step()) {
                rows.push_back(RowOf(statement));
                for (const std::string &text : rows.back().texts)
                    bytes += text.size();
            }
            const bool isFull = rows.size() >= kBlockRows || bytes >= kBlockBytes;
            MoveBehind(isFull ? static_cast<int64_t>(rows.back().source)
                              : next_ | static_cast<int64_t>(kMessageMask));
        }
        return rows;
    }

private:
    EngineRow RowOf(const SqliteStatement &statement) {
        EngineRow row;
        row.source = static_cast<uint64_t>(statement.Number(0));
        ForEachColumn(row, [&](size_t column, std::string *text) {
            if (text != nullptr)
                *text = statement.Blob(static_cast<int>(column) + 1);
            else
                row.second = statement.Number(static_cast<int>(column) + 1);
        });
        constexpr int kNulls = static_cast<int>(std::size(kEngineColumns)) + 1;
        ++result_.rows;
        result_.nulls += static_cast<uint64_t>(statement.Number(kNulls));
        result_.wrongTimes += static_cast<uint64_t>(statement.Number(kNulls + 1));
        return row;
    }

    // Passes over ids that no row has.
    void MoveBehind(int64_t id) {
        hasEnded_ = id >= last_;
        if (hasEnded_)
            return;
        SqliteStatement following(database_,
                                  "SELECT id FROM logs WHERE id > ?1 AND id <= ?2 ORDER BY id LIMIT 1");
        following.Bind(1, id);
        following.Bind(2, last_);
        hasEnded_ = !following.Step();
        if (!hasEnded_)
            next_ = following.Number(0);
    }

    SqliteConnection &database_;
    ClusterImportResult &result_;
    std::string sql_;
    int64_t last_;
    int64_t next_;
    bool hasEnded_;
};

// An hour of a log belongs to one server, always the same, so that all servers get a part of each day.
size_t ServerOf(const EngineRow &row, size_t servers) {
    return FirstEngineId(row.second) / FirstEngineId(kHourSec) % servers;
}

} // namespace

ClusterImportResult ImportIntoCluster(const ClusterImportOrder &order) {
    EngineServers servers(order.cluster, "--db");
    BlockTransfer transfer(servers, order.node);
    SqliteConnection database(order.database,
                              {.mode = SqliteMode::kWrite, .heedsStopSignals = true, .trustsSchema = false});
    ClusterImportResult result;
    BlockReader reader(database, result);
    const uint64_t total = reader.IdsBehind();
    transfer.AwaitOthers();
    for (std::vector<EngineRow> rows = reader.Read(); !rows.empty(); rows = reader.Read()) {
        std::vector<std::vector<EngineRow>> parts(servers.Count());
        for (EngineRow &row : rows)
            parts[ServerOf(row, parts.size())].push_back(std::move(row));
        for (size_t server = 0; server < parts.size(); ++server) {
            StopSignals::Check();
            try {
                result.sent += transfer.Store(server, parts[server]);
            } catch (const DatabaseError &error) {
                throw DatabaseError(order.database + ": " + std::to_string(result.sent) +
                                    " rows were sent, then: " + error.what());
            }
        }
        order.onProgress(total, total - reader.IdsBehind());
    }
    return result;
}

} // namespace kelo::tool
