#include "platform/db_fixture.h"

namespace kelo::test {
namespace {

using Result = ConnectionTest;

// Every way that rows take into a result has to give the same texts.
TEST_F(Result, HoldsEveryKindOfValueHoweverItIsDelivered) {
    RunSql(path_, "INSERT INTO logs VALUES(1, 'a', 9223372036854775807, 'x'),"
                  "(2, '', -1.5, NULL), (3, NULL, x'', x'616200630a'), (-4, '\"''%', 1e300, '日本')");
    const Rows expected = {{"-4", "\"'%", "1.0e+300", "日本", "\"'%"},
                           {"1", "a", "9223372036854775807", "x", "a"},
                           {"2", "", "-1.5", std::nullopt, ""},
                           {"3", std::nullopt, "", "ab", std::nullopt}};
    const std::vector<std::string> columns = {"id", "host", "size", "msg", "Host"};
    const std::string sql = "SELECT * FROM logs ORDER BY id";
    EXPECT_EQ(Run(sql, columns).rows, expected);
    EXPECT_EQ(Run(sql, columns, {{0, 0}}).rows, expected);
    EXPECT_EQ(Run("DELETE FROM logs RETURNING id, host, size, msg", columns).rows.size(), 4U);
}

TEST_F(Result, TakesTheFirstOfColumnsWithOneNameInAnyCase) {
    EXPECT_EQ(Run("SELECT 1 AS a, 2 AS a, 3 AS \"a b\", 4 AS A", {"a", "a b", "A", "b"}).rows,
              (Rows{{"1", "3", "1", std::nullopt}}));
}

TEST_F(Result, HoldsRowsOfAnyWidth) {
    std::string values;
    for (int i = 0; i < 300; ++i)
        values += std::to_string(i) + " AS c" + std::to_string(i) + ", ";
    EXPECT_EQ(Run("SELECT " + values + "'z' AS z", {"c0", "c299", "z"}).rows, (Rows{{"0", "299", "z"}}));
    // Around the sizes where offsets get wider, and past the size of a chunk.
    for (const size_t size : {247U, 248U, 249U, 250U, 65524U, 65525U, 65526U, 65527U, 3000000U}) {
        const std::string text(size, 'x');
        EXPECT_EQ(Run("SELECT 1 AS a, '" + text + "' AS b, 2 AS c", {"a", "b", "c"}).rows,
                  (Rows{{"1", text, "2"}}));
    }
}

TEST_F(Result, HoldsIntegersInAnyOrder) {
    constexpr int64_t kMost = std::numeric_limits<int64_t>::max();
    const std::vector<int64_t> numbers = {0,         1,     2,      9,  10,    13,         19,
                                          20,        25,    24,     -1, -2,    3,          kMost - 7,
                                          kMost - 1, kMost, -kMost, 1,  kMost, -kMost - 1, kMost};
    Rows expected;
    std::string values;
    for (const int64_t number : numbers) {
        expected.push_back({std::to_string(number)});
        values += (values.empty() ? "(" : ",(") + std::to_string(number) + ")";
    }
    EXPECT_EQ(Run("WITH numbers(a) AS (VALUES " + values + ") SELECT a FROM numbers", {"a"}).rows, expected);
}

TEST_F(Result, IsThereWithoutRowsForAStatementWithColumnsOnly) {
    for (const char *sql : {"SELECT * FROM logs", "SELECT id FROM logs", "DELETE FROM logs RETURNING id"})
        EXPECT_TRUE(Run(sql).hasResult) << sql;
    for (const char *sql : {"DELETE FROM logs", "", " ;; -- nothing", "/* nothing"}) {
        EXPECT_EQ(Run(sql).status, 0) << sql;
        EXPECT_FALSE(Run(sql).hasResult) << sql;
    }
}

TEST_F(Result, OutlivesItsConnection) {
    DBResult_tag *result = nullptr;
    ASSERT_EQ(KELODBExecute(connection_.get(), "SELECT 'kept' AS a, 1, 2", &result), 0);
    connection_.reset();
    EXPECT_STREQ(KELODBFetchField(result, 0, "a"), "kept");
    EXPECT_EQ(KELODBFetchField(result, 1, "a"), nullptr);
    EXPECT_EQ(KELODBFetchField(result, 0, nullptr), nullptr);
    EXPECT_LT(KELODBFetchRow(result, nullptr), 0);
    KELODBFreeResult(result);
}

} // namespace
} // namespace kelo::test
