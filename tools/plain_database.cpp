#include "plain_database.h"

#include <cstdlib>
#include <utility>

#include "errors.h"
#include "keloplatform/kelodb.h"

namespace kelo::tool {
namespace {

struct ResultFreer {
    void operator()(DBResult_tag *result) const { KELODBFreeResult(result); }
};

} // namespace

void PlainDatabase::Closer::operator()(DBConnect_tag *connection) const {
    KELODBClose(connection);
}

PlainDatabase::PlainDatabase(LogSource source)
    : source_(std::move(source)),
      connection_(KELODBConnect(nullptr, nullptr, nullptr, source_.path.c_str())) {
    if (connection_ == nullptr)
        throw DatabaseError(DescribeDatabaseProblem(source_));
}

std::vector<PlainDatabase::Row> PlainDatabase::Query(const std::string &sql,
                                                     const std::vector<std::string> &columns) const {
    DBResult_tag *raw = nullptr;
    if (KELODBExecute(connection_.get(), sql.c_str(), &raw) < 0)
        throw DatabaseError(source_.path + ": " + KELODBErrorGet(connection_.get()));
    const std::unique_ptr<DBResult_tag, ResultFreer> result(raw);
    std::vector<Row> rows;
    for (unsigned int row = 0; result != nullptr && KELODBFetchRow(result.get(), &row) >= 0;) {
        Row &values = rows.emplace_back();
        for (const std::string &column : columns) {
            const char *text = KELODBFetchField(result.get(), row, column.c_str());
            values.emplace_back(text != nullptr ? text : "");
        }
    }
    return rows;
}

std::optional<PlainDatabase::Row> PlainDatabase::FirstRow(const std::string &sql,
                                                          const std::vector<std::string> &columns) const {
    std::vector<Row> rows = Query(sql, columns);
    return rows.empty() ? std::nullopt : std::optional(std::move(rows.front()));
}

std::vector<std::string> PlainDatabase::Column(const std::string &sql, const std::string &column) const {
    std::vector<std::string> values;
    for (Row &row : Query(sql, {column}))
        values.push_back(std::move(row.front()));
    return values;
}

int64_t PlainDatabase::Number(const std::string &sql) const {
    const auto row = FirstRow(sql, {"value"});
    return row ? std::strtoll(row->front().c_str(), nullptr, 10) : 0;
}

bool PlainDatabase::HasTable(const std::string &table) const {
    return Number("SELECT count(*) AS value FROM sqlite_master WHERE type = 'table' AND name = '" + table +
                  "'") != 0;
}

} // namespace kelo::tool
