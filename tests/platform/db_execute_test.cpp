#include "platform/db_fixture.h"

namespace kelo::test {
namespace {

class Executing : public ConnectionTest {
protected:
    Executing()
        : ConnectionTest("INSERT INTO logs(id, host, msg) VALUES(1,'a','x'),(2,'b','y;z'),(3,'c','--')") {}
    std::string Count() const { return RunSql(path_, "SELECT count(*) FROM logs"); }
};

TEST_F(Executing, RefusesASecondStatementBeforeAnythingRuns) {
    for (const char *sql : {"DELETE FROM logs; SELECT 1", "DELETE FROM logs;garbage",
                            "/* a */ DELETE FROM logs -- b\n; /* c */ DELETE FROM logs",
                            "PRAGMA user_version=7; DELETE FROM logs"}) {
        const Outcome outcome = Run(sql);
        EXPECT_EQ(outcome.status, -1) << sql;
        EXPECT_EQ(outcome.error, "one statement per call") << sql;
        EXPECT_EQ(Run(sql, {}, {{1, 0}}).status, -1) << sql;
    }
    EXPECT_EQ(Count(), "3");
    EXPECT_EQ(RunSql(path_, "PRAGMA user_version"), "0");
}

TEST_F(Executing, TakesOneStatementWithWhateverBlanksAndCommentsAroundIt) {
    for (const char *sql : {"SELECT * FROM logs", ";; SELECT * FROM logs ; ;\n",
                            "-- a;\nSELECT * FROM logs -- b; c", "/* ' */SELECT * FROM logs/* ; */;-- x",
                            "SELECT * FROM logs /* open;", "SELECT * FROM logs WHERE msg <> ';' --;"}) {
        EXPECT_EQ(Run(sql, {"id"}).rows.size(), 3U) << sql;
        EXPECT_EQ(Run(sql, {"id", "msg"}, {{1, 1}}).rows.size(), 1U) << sql;
    }
    const char *trigger = "CREATE TRIGGER t AFTER DELETE ON logs BEGIN SELECT 1; SELECT 2; END;";
    EXPECT_EQ(Run(trigger).status, 0);
    EXPECT_EQ(Run("EXPLAIN QUERY PLAN SELECT * FROM logs", {"detail"}).rows.size(), 1U);
}

TEST_F(Executing, BoundsOnlyASelect) { // Debian's SQLite knows DELETE ... LIMIT
    EXPECT_EQ(Run("DELETE FROM logs", {}, {{1, 0}}).errorCode, SQLITE_ERROR);
    EXPECT_EQ(Count(), "3");
    const std::string sql = "SELECT * FROM logs";
    EXPECT_EQ(Run(sql, {}, {{0, 1}}).rows.size(), 2U);
    EXPECT_EQ(Run(sql, {}, {{4294967295U, 0}}).rows.size(), 3U);
}

// Few rows are read one by one, many of several columns in another way: the result must be the same.
TEST_F(Executing, DeliversManyRowsAsItDeliversFew) {
    RunSql(path_, "DELETE FROM logs;"
                  "WITH n(i) AS (SELECT 1 UNION ALL SELECT i + 1 FROM n WHERE i < 300) "
                  "INSERT INTO logs(id, host, msg) SELECT i, iif(i % 3, 'h' || i, NULL), CASE i % 5 WHEN 0 "
                  "THEN i / 3.0 WHEN 1 THEN "
                  "x'C3A4FF' WHEN 2 THEN -i * 30000000000000000 WHEN 3 THEN '' ELSE 'it''s ;' END FROM n");
    for (const char *sql :
         {"SELECT id, host, msg, host FROM logs", " ;-- a\nSELECT *, 1 AS id FROM logs /* ; */;",
          "WITH x AS (SELECT * FROM logs) SELECT host AS id, msg, id AS host FROM x",
          "SELECT * FROM logs WHERE msg <> ';' ORDER BY msg, id DESC --;"}) {
        const std::vector<std::string> columns = {"id", "host", "msg"};
        const Outcome all = Run(sql, columns);
        auto pages = Run(sql, columns, {{150, 0}}).rows;
        for (unsigned int offset = 150; offset < 600; offset += 150) {
            for (const auto &row : Run(sql, columns, {{150, offset}}).rows)
                pages.push_back(row);
        }
        EXPECT_GT(pages.size(), 200U) << sql;
        EXPECT_EQ(all.rows, pages) << sql;
    }
    const Outcome late = Run("SELECT id, host, abs(iif(id = 299, -9223372036854775808, id)) FROM logs");
    EXPECT_EQ(late.error, "integer overflow");
    EXPECT_FALSE(late.hasResult);
}

TEST_F(Executing, FailsForWhatIsTooBigAndWithoutAConnection) {
    const Outcome outcome = Run("SELECT zeroblob(100000000), 2, 3");
    EXPECT_THAT(outcome.error, HasSubstr("too big"));
    EXPECT_FALSE(outcome.hasResult);
    DBResult_tag *result = nullptr;
    EXPECT_EQ(KELODBExecute(nullptr, "SELECT 1", &result), -1);
    EXPECT_EQ(KELODBSelectLimit(nullptr, "SELECT 1", 1, 0, &result), -1);
}

TEST(Escaping, FailsInsteadOfCuttingTheText) {
    char out[8] = "#######";
    EXPECT_EQ(KELODBEscapeStringEX(nullptr, out, 6, "a'b'", 4), -1);
    EXPECT_STREQ(out + 6, "#");
    EXPECT_EQ(KELODBEscapeStringEX(nullptr, out, 7, "a'b'", 4), 6);
    EXPECT_STREQ(out, "a''b''");
    EXPECT_EQ(KELODBEscapeStringEX2(nullptr, out, 8, "a\0b", 3), -1);
    EXPECT_EQ(KELODBEscapeStringEX2(nullptr, out, 0, "", 0), -1);
    EXPECT_EQ(KELODBEscapeBackslashEX2(nullptr, out, 8, "a%_\\"), 7);
    EXPECT_STREQ(out, "a\\%\\_\\\\");
    EXPECT_EQ(KELODBEscapeBackslashEX2(nullptr, out, 7, "a%_\\"), -1);
}

// Inserts of one form are compiled once; what is stored and what fails must be as without that.
TEST_F(Executing, InsertsTheSameByARepeatedFormAsSQLite) {
    const std::vector<std::string> inserts = {
        "INSERT INTO t VALUES(NULL, 'a', 1)",
        "INSERT INTO t VALUES(NULL, '12', 12);",
        "INSERT INTO t VALUES(NULL, 'O''Brien''''s', '\xff %q')",
        "INSERT INTO t VALUES(NULL, 999999999999999999, 9999999999999999999)",
        "INSERT INTO t VALUES(NULL, x'41', 'a' || 'b')",
        "INSERT INTO t VALUES(NULL, 'a', 1), (NULL, 'b', 2)",
        "INSERT OR REPLACE INTO t(id, a) VALUES (1, 'newer')",
        "INSERT INTO t(id, a) VALUES (2, 'id is taken')",
        "INSERT INTO t VALUES(NULL, 'no end)",
        "INSERT INTO t VALUES('a', 1)",
        "INSERT INTO t VALUES(NULL, 'after errors', 1)",
    };
    const std::string twin = root_.File("twin.db");
    for (const std::string &file : {path_, twin})
        RunSql(file, "CREATE TABLE t(id INTEGER PRIMARY KEY, a, b TEXT)");
    TestDatabase other(twin);
    sqlite3 *const db = other.Get();
    for (const std::string &sql : inserts) {
        const bool isGood = sqlite3_exec(db, sql.c_str(), nullptr, nullptr, nullptr) == SQLITE_OK;
        const Outcome outcome = Run(sql);
        EXPECT_EQ(outcome.status == 0, isGood) << sql;
        EXPECT_EQ(outcome.errorCode, sqlite3_errcode(db)) << sql;
        EXPECT_EQ(outcome.error, sqlite3_errmsg(db)) << sql;
    }
    const std::string rows = "SELECT group_concat(id || quote(a) || quote(b)) FROM t";
    EXPECT_EQ(RunSql(path_, rows), RunSql(twin, rows));
    RunSql(path_, "DROP TABLE t");
    EXPECT_EQ(Run(inserts.back()).error, "no such table: t");
}

// The values of an indexed column are found by jumps; they and their order must be as without.
TEST_F(Executing, FindsTheSameDifferentValuesAsSQLite) {
    const std::string rows = "WITH n(i) AS (SELECT 1 UNION ALL SELECT i + 1 FROM n WHERE i < 500) "
                             "INSERT INTO logs(host) SELECT ";
    const struct {
        const char *column;
        const char *index;
    } tables[] = {{"host TEXT", "host"},     {"host TEXT", "host DESC"},
                  {"host TEXT", "host, id"}, {"host TEXT COLLATE NOCASE", "host"},
                  {"host INTEGER", "host"},  {"host", "host"},
                  {"host TEXT", "msg"}};
    for (const auto &[column, index] : tables) {
        const std::string path = root_.File("values.db");
        fs::remove(path);
        RunSql(path, std::string("CREATE TABLE logs(id INTEGER PRIMARY KEY, ") + column +
                         ", msg TEXT); CREATE INDEX i ON logs(" + index + ");" + rows +
                         "iif(i % 7 = 0, NULL, iif(i % 5 = 0, i % 3, 'b' || (i % 3))) FROM n;" + rows +
                         "iif(i % 2, 'B1', iif(i % 3, x'6231', '')) FROM n;" + rows + "i / 3.0 FROM n");
        const Connection connection = ConnectTo(path);
        for (const char *sql :
             {"SELECT host FROM logs GROUP BY host ORDER BY host asc", "SELECT DISTINCT host FROM logs"}) {
            for (const auto &page : std::vector<std::optional<std::pair<unsigned, unsigned>>>{
                     {}, {{3, 1}}, {{0, 4}}, {{9, 9999}}}) {
                const Outcome jumping = Execute(connection, sql, {"host"}, page);
                const Outcome reading = Execute(connection, std::string(sql) + " LIMIT 100000", {"host"});
                Rows expected = reading.rows;
                const size_t skipped = page ? std::min<size_t>(page->second, expected.size()) : 0;
                expected.erase(expected.begin(), expected.begin() + static_cast<std::ptrdiff_t>(skipped));
                if (page && page->first != 0)
                    expected.resize(std::min<size_t>(page->first, expected.size()));
                EXPECT_EQ(jumping.rows, expected) << column << ", " << index << ": " << sql;
            }
        }
    }
}

} // namespace
} // namespace kelo::test
