#include "platform/db_fixture.h"

namespace kelo::test {
namespace {

Outcome Read(const Connection &connection, int status, DBResult_tag *result,
             const std::vector<std::string> &columns) {
    Outcome outcome{.status = status, .hasResult = result != nullptr, .rows = {}, .error = {}};
    outcome.errorCode = sqlite3_errcode(KELODBInternalDBHdlGet(connection.get()));
    outcome.error = KELODBErrorGet(connection.get());
    unsigned int row = 0;
    while (KELODBFetchRow(result, &row) >= 0) {
        auto &texts = outcome.rows.emplace_back();
        for (const std::string &column : columns) {
            const char *text = KELODBFetchField(result, row, column.c_str());
            texts.push_back(text != nullptr ? std::optional<std::string>(text) : std::nullopt);
        }
    }
    EXPECT_EQ(KELODBNumRows(result), static_cast<int>(outcome.rows.size()));
    KELODBFreeResult(result);
    return outcome;
}

} // namespace

Outcome Execute(const Connection &connection, const std::string &sql,
                const std::vector<std::string> &columns) {
    DBResult_tag *result = nullptr;
    const int status = KELODBExecute(connection.get(), sql.c_str(), &result);
    return Read(connection, status, result, columns);
}

Outcome SelectLimit(const Connection &connection, const std::string &sql, unsigned int limit,
                    unsigned int offset, const std::vector<std::string> &columns) {
    DBResult_tag *result = nullptr;
    const int status = KELODBSelectLimit(connection.get(), sql.c_str(), limit, offset, &result);
    return Read(connection, status, result, columns);
}

} // namespace kelo::test
