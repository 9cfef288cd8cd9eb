#include "platform/db_fixture.h"

using namespace kelo::test;

namespace {

using Row = std::vector<std::optional<std::string>>;
using Rows = std::vector<Row>;

class Result : public testing::Test {
protected:
    void SetUp() override {
        RunSql(path, "CREATE TABLE logs(id INTEGER PRIMARY KEY, host TEXT, size, msg TEXT)");
        connection = ConnectTo(path);
    }

    TempRoot root;
    const std::string path = root.File("logs.db");
    Connection connection;
};

} // namespace

// Every way that rows take into a result has to give the same texts.
TEST_F(Result, HoldsEveryKindOfValueHoweverItIsDelivered) {
    RunSql(path, "INSERT INTO logs VALUES(1, 'a', 9223372036854775807, 'x'),"
                 "(2, '', -1.5, NULL), (3, NULL, x'', x'616200630a'), (-4, '\"''%', 1e300, '日本')");
    const Rows expected = {{"-4", "\"'%", "1.0e+300", "日本", std::nullopt},
                           {"1", "a", "9223372036854775807", "x", std::nullopt},
                           {"2", "", "-1.5", std::nullopt, std::nullopt},
                           {"3", std::nullopt, "", "ab", std::nullopt}};
    const std::vector<std::string> columns = {"id", "host", "size", "msg", "Host"};
    const std::string sql = "SELECT * FROM logs ORDER BY id";
    EXPECT_EQ(Execute(connection, sql, columns).rows, expected);
    EXPECT_EQ(SelectLimit(connection, sql, 100, 0, columns).rows, expected);
    EXPECT_EQ(SelectLimit(connection, sql, 0, 0, columns).rows, expected);
    EXPECT_EQ(Execute(connection, "DELETE FROM logs RETURNING id, host, size, msg", columns).rows.size(), 4U);
}

TEST_F(Result, KeepsTheOrderOfTheStatement) {
    RunSql(path, "WITH n(i) AS (SELECT 1 UNION ALL SELECT i + 1 FROM n WHERE i < 3000)"
                 "INSERT INTO logs SELECT i, printf('%04d', i * 7919 % 3001), 1, 'm' FROM n");
    const Rows rows = Execute(connection, "SELECT * FROM logs ORDER BY size, host DESC", {"host"}).rows;
    ASSERT_EQ(rows.size(), 3000U);
    EXPECT_TRUE(std::is_sorted(rows.rbegin(), rows.rend()));
}

TEST_F(Result, TakesTheFirstOfColumnsWithOneName) {
    EXPECT_EQ(Execute(connection, "SELECT 1 AS a, 2 AS a, 3 AS \"a b\", 4 AS A", {"a", "a b", "A", "b"}).rows,
              (Rows{{"1", "3", "4", std::nullopt}}));
    EXPECT_EQ(
        Execute(connection, "SELECT max(rowid), COUNT(*), 1 FROM logs", {"COUNT(*)", "max(rowid)"}).rows,
        (Rows{{"0", std::nullopt}}));
}

TEST_F(Result, HoldsRowsOfAnyWidth) {
    std::string values = "0 AS c0";
    for (int i = 1; i < 300; ++i)
        values += "," + std::to_string(i) + " AS c" + std::to_string(i);
    EXPECT_EQ(Execute(connection, "SELECT " + values, {"c0", "c299", "c300"}).rows,
              (Rows{{"0", "299", std::nullopt}}));
    // Around the row size where offsets get wider, and past the size of a chunk.
    for (const size_t size : {65500U, 65516U, 65517U, 65518U, 65519U, 65536U, 3000000U}) {
        const std::string sql =
            "SELECT 'first' AS a, printf('%.*c', " + std::to_string(size) + ", 'x') AS b, 'last' AS c";
        EXPECT_EQ(Execute(connection, sql, {"a", "b", "c"}).rows,
                  (Rows{{"first", std::string(size, 'x'), "last"}}));
    }
}

TEST_F(Result, IsThereWithoutRowsForAStatementWithColumnsOnly) {
    for (const char *sql : {"SELECT * FROM logs", "SELECT id FROM logs", "DELETE FROM logs RETURNING id"})
        EXPECT_TRUE(Execute(connection, sql).hasResult) << sql;
    for (const char *sql : {"DELETE FROM logs", "", " ;; -- nothing", "/* nothing"}) {
        const Outcome outcome = Execute(connection, sql);
        EXPECT_EQ(outcome.status, 0) << sql;
        EXPECT_FALSE(outcome.hasResult) << sql;
    }
}

TEST_F(Result, OutlivesItsConnection) {
    DBResult_tag *result = nullptr;
    ASSERT_EQ(KELODBExecute(connection.get(), "SELECT 'kept' AS a, 1, 2", &result), 0);
    connection.reset();
    EXPECT_STREQ(KELODBFetchField(result, 0, "a"), "kept");
    EXPECT_EQ(KELODBFetchField(result, 1, "a"), nullptr);
    EXPECT_EQ(KELODBFetchField(result, 0, nullptr), nullptr);
    EXPECT_LT(KELODBFetchRow(result, nullptr), 0);
    KELODBFreeResult(result);
}
