#include "cluster/cluster_export.h"

#include <unordered_map>
#include <vector>

#include "base/number_text.h"
#include "base/sqlite.h"
#include "base/stop_signals.h"
#include "cluster/engine_row.h"
#include "cluster/engine_servers.h"
#include "store/log_store.h"

namespace kelo::tool {
namespace {

// Rows that are compared and stored as a whole, unless one second has more.
constexpr uint64_t kSpanRows = 50'000;
constexpr int kTries = 3;

// Seconds, both included, and the rows that the cluster had of them.
struct Span {
    int64_t first = 0;
    int64_t last = 0;
    uint64_t rows = 0;
};

// Adds a span to the last one as long as that has few rows.
void Append(std::vector<Span> &spans, const Span &span) {
    if (spans.empty() || spans.back().rows + span.rows > kSpanRows) {
        spans.push_back(span);
        return;
    }
    spans.back().last = span.last;
    spans.back().rows += span.rows;
}

class Exporter {
public:
    explicit Exporter(const ClusterExportOrder &order)
        : order_(order), servers_(order.cluster, "--db"), created_(order.database),
          database_(order.database, {.mode = SqliteMode::kWrite, .heedsStopSignals = true}) {}

    ClusterExportResult Run() {
        uint64_t total = 0;
        const std::vector<Span> days = Days();
        for (const Span &day : days)
            total += day.rows;
        for (const Span &day : days) {
            for (const Span &span : PartsOf(day)) {
                StopSignals::Check();
                result_.rows += Store(span);
                order_.onProgress(total, result_.rows);
            }
        }
        return result_;
    }

private:
    // Any server answers for all; the first that can.
    template <typename Question>
    auto AnyServer(Question ask) {
        for (size_t server = 0;; ++server) {
            try {
                return ask(server);
            } catch (const DatabaseError &) {
                if (server + 1 >= servers_.Count())
                    throw;
            }
        }
    }

    std::vector<Span> Spans(const std::string &sql) {
        std::vector<Span> spans;
        for (const auto &row : AnyServer([&](size_t server) { return servers_.Ask(server, sql); }))
            spans.push_back({SignedNumber(row.at(0)), SignedNumber(row.at(1)), UnsignedNumber(row.at(2))});
        return spans;
    }

    // All times before 1970 are one, and so are those too late for an id.
    std::vector<Span> Days() {
        return Spans("SELECT min(utcsec), max(utcsec), count() FROM logs GROUP BY "
                     "intDiv(least(greatest(utcsec, -1), 8589934592) + 86400, 86400) AS day ORDER BY day");
    }

    std::vector<Span> PartsOf(const Span &day) {
        if (day.rows <= kSpanRows)
            return {day};
        std::vector<Span> parts;
        for (const Span &second :
             Spans("SELECT utcsec, utcsec, count()" + From(day) + " GROUP BY utcsec ORDER BY utcsec"))
            Append(parts, second);
        return parts;
    }

    static std::string From(const Span &span) {
        return " FROM logs WHERE id >= " + std::to_string(FirstEngineId(span.first)) +
               " AND id <= " + std::to_string(LastEngineId(span.last)) +
               " AND utcsec >= " + std::to_string(span.first) + " AND utcsec <= " + std::to_string(span.last);
    }

    // Returns the number of rows of the cluster.
    uint64_t Store(const Span &span) {
        for (int attempt = 0; attempt <= kTries; ++attempt) {
            const std::vector<uint64_t> stored = StoredHashes(span);
            uint64_t sum = 0;
            for (const uint64_t hash : stored)
                sum += hash;
            const std::vector<uint64_t> found = AnyServer([&](size_t server) {
                return servers_.AskNumbers(server,
                                           "SELECT count(), sum(" + HashExpression() + ")" + From(span), 2);
            });
            if (found[0] == stored.size() && found[1] == sum)
                return found[0];
            const std::vector<EngineRow> rows = Rows(span, found[0]);
            const std::vector<const EngineRow *> missing = Missing(rows, stored);
            if (missing.empty() && rows.size() == found[0]) // the database has others besides
                return found[0];
            Insert(missing);
        }
        throw DatabaseError(order_.cluster + ": the rows of the seconds " + std::to_string(span.first) +
                            " to " + std::to_string(span.last) + " change while they are read");
    }

    // The rows of the database.
    std::vector<uint64_t> StoredHashes(const Span &span) {
        std::vector<uint64_t> hashes;
        SqliteStatement statement(database_,
                                  "SELECT " + EngineColumns() + " FROM logs WHERE utcsec BETWEEN ?1 AND ?2");
        statement.Bind(1, span.first);
        statement.Bind(2, span.last);
        EngineRow row;
        while (statement.Step()) {
            ForEachColumn(row, [&](size_t column, std::string *text) {
                if (text != nullptr)
                    *text = statement.Blob(static_cast<int>(column));
                else
                    row.second = statement.Number(static_cast<int>(column));
            });
            hashes.push_back(HashOf(row));
        }
        return hashes;
    }

    // The rows of the cluster, in the order of their ids.
    std::vector<EngineRow> Rows(const Span &span, uint64_t expected) {
        const std::string bytes = AnyServer([&](size_t server) {
            return servers_.Run(server,
                                "SELECT " + EngineColumns() + From(span) + " ORDER BY id FORMAT RowBinary");
        });
        std::vector<EngineRow> rows;
        rows.reserve(expected);
        for (std::string_view rest = bytes; !rest.empty();) {
            std::optional<EngineRow> row = TakeRow(rest);
            if (!row)
                throw DatabaseError(order_.cluster + ": the answer of a server is not whole");
            rows.push_back(std::move(*row));
        }
        return rows;
    }

    // Equal rows are as often in both.
    static std::vector<const EngineRow *> Missing(const std::vector<EngineRow> &rows,
                                                  const std::vector<uint64_t> &stored) {
        std::unordered_map<uint64_t, size_t> left;
        for (const uint64_t hash : stored)
            ++left[hash];
        std::vector<const EngineRow *> missing;
        for (const EngineRow &row : rows) {
            size_t &equal = left[HashOf(row)];
            if (equal == 0)
                missing.push_back(&row);
            else
                --equal;
        }
        return missing;
    }

    void Insert(const std::vector<const EngineRow *> &rows) {
        std::string places;
        for (size_t column = 1; column <= std::size(kEngineColumns); ++column)
            places += (column == 1 ? "?" : ", ?") + std::to_string(column);
        SqliteTransaction transaction(database_);
        SqliteStatement insert(database_,
                               "INSERT INTO logs (" + EngineColumns() + ") VALUES (" + places + ")");
        for (const EngineRow *row : rows) {
            ForEachColumn(*row, [&](size_t column, const std::string *text) {
                if (text != nullptr)
                    insert.Bind(static_cast<int>(column) + 1, std::string_view(*text));
                else
                    insert.Bind(static_cast<int>(column) + 1, row->second);
            });
            insert.Run();
        }
        transaction.Commit();
        result_.stored += rows.size();
    }

    const ClusterExportOrder &order_;
    EngineServers servers_;
    LogStore created_;
    SqliteConnection database_;
    ClusterExportResult result_;
};

} // namespace

ClusterExportResult ExportFromCluster(const ClusterExportOrder &order) {
    return Exporter(order).Run();
}

} // namespace kelo::tool
