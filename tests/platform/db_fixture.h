#pragma once

#include "keloplatform/kelodb.h"
#include "support/test.h"

namespace kelo::test {

struct CloseConnection {
    void operator()(DBConnect_tag *connection) const { KELODBClose(connection); }
};
using Connection = std::unique_ptr<DBConnect_tag, CloseConnection>;

inline Connection ConnectTo(const std::string &path) {
    return Connection(KELODBConnect(nullptr, nullptr, nullptr, path.c_str()));
}

// The fields of a row by the columns that were asked for; NULL and a missing column as nothing.
using Rows = std::vector<std::vector<std::optional<std::string>>>;

// What one call gave: its rows, or the connection's error after it.
struct Outcome {
    int status;
    bool hasResult;
    int errorCode;
    std::string error;
    Rows rows;
};

// Runs a statement and reads the named columns of every row; of a page where there is one.
inline Outcome Execute(const Connection &connection, const std::string &sql,
                       const std::vector<std::string> &columns = {},
                       std::optional<std::pair<unsigned int, unsigned int>> page = {}) {
    DBResult_tag *result = nullptr;
    const int status =
        page ? KELODBSelectLimit(connection.get(), sql.c_str(), page->first, page->second, &result)
             : KELODBExecute(connection.get(), sql.c_str(), &result);
    Outcome outcome{status,
                    result != nullptr,
                    sqlite3_errcode(KELODBInternalDBHdlGet(connection.get())),
                    KELODBErrorGet(connection.get()),
                    {}};
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

// A connection to a database with a table "logs".
class ConnectionTest : public testing::Test {
protected:
    explicit ConnectionTest(const std::string &sql = "") {
        RunSql(path_, "CREATE TABLE logs(id INTEGER PRIMARY KEY, host TEXT, size, msg TEXT);" + sql);
        connection_ = ConnectTo(path_);
    }
    Outcome Run(const std::string &sql, const std::vector<std::string> &columns = {},
                std::optional<std::pair<unsigned int, unsigned int>> page = {}) const {
        return Execute(connection_, sql, columns, page);
    }

    TempRoot root_;
    const std::string path_ = root_.File("logs.db");
    Connection connection_;
};

} // namespace kelo::test
