#include <sqlite3.h>

#include "query/query_fixture.h"

using namespace kelo::test;

namespace {

using Schema = QueryTest;

TEST_F(Schema, DefinesOneTableOfLogsForWorkingDatabasesAndArchives) {
    const std::string archive = root_.File("archive.db");
    CreateLogDatabase(archive, "archive.sql");
    const std::string definitions = "SELECT group_concat(name || sql, ';') FROM (SELECT * FROM sqlite_master "
                                    "WHERE tbl_name = 'logs' ORDER BY name)";
    EXPECT_THAT(QueryText(path_, definitions), testing::HasSubstr("logs_utcsec_idx"));
    EXPECT_EQ(QueryText(archive, definitions), QueryText(path_, definitions));
    EXPECT_EQ(SyslogDBVersionGet(path_), 2);
    EXPECT_EQ(SyslogDBVersionGet(archive), 1);
}

TEST_F(Schema, KeepsWhatIsThereWhenItIsAppliedAgain) {
    const std::string archive = root_.File("archive.db");
    for (int time = 0; time < 2; ++time) {
        CreateLogDatabase(archive, "archive.sql");
        EXPECT_EQ(QueryText(archive, "SELECT count(*) || min(id) FROM db_info"), "11");
        RunSql(archive, "UPDATE db_info SET device = 'nas'");
    }
    EXPECT_EQ(QueryText(archive, "SELECT device FROM db_info"), "nas");
}

TEST_F(Schema, NeverUsesAnIdAgain) {
    InsertSampleLogs(path_, 3);
    EXPECT_EQ(SyslogDBDelete(path_, {}), 0);
    EXPECT_EQ(TakeStatement(), "DELETE FROM logs");
    InsertSampleLogs(path_, 1);
    EXPECT_EQ(QueryText(path_, "SELECT group_concat(id) FROM logs"), "4");
}

// The statements that a plain scan of a large table would make slow.
TEST_F(Schema, AnswersTheLibrarysSearchesThroughAnIndex) {
    const struct {
        std::string statement;
        const char *plan;
    } cases[] = {
        {"SELECT * FROM logs WHERE ((host = 'a') OR (host = 'b')) ORDER BY id desc", "logs_host_idx"},
        {"SELECT * FROM logs WHERE (prog = 'a') ORDER BY id desc", "logs_prog_idx"},
        {"SELECT COUNT(*) FROM logs WHERE (ldate >= '2020/01/02')", "logs_ldate_idx"},
        {"SELECT COUNT(*) FROM logs WHERE (llevel = 'err') AND (utcsec >= 1)", "logs_utcsec_idx"},
        {"SELECT *, (SELECT max(rowid) FROM logs) totalCount FROM logs WHERE "
         "( id > totalCount - 50 AND id <= totalCount - 0)",
         "INTEGER PRIMARY KEY (rowid>? AND rowid<?)"},
    };
    sqlite3 *db = nullptr;
    ASSERT_EQ(sqlite3_open(path_.c_str(), &db), SQLITE_OK);
    const auto take = [](void *text, int, char **values, char **) {
        *static_cast<std::string *>(text) += values[3];
        return 0;
    };
    for (const auto &[statement, plan] : cases) {
        std::string found;
        sqlite3_exec(db, ("EXPLAIN QUERY PLAN " + statement).c_str(), take, &found, nullptr);
        EXPECT_THAT(found, testing::HasSubstr(plan)) << statement;
    }
    sqlite3_close(db);
}

} // namespace
