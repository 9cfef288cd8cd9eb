#include "query/query_fixture.h"

using namespace kelo::test;

namespace {

using Schema = QueryTest;

TEST_F(Schema, DefinesOneTableOfLogsForWorkingDatabasesAndArchives) {
    const std::string archive = root_.File("archive.db");
    CreateLogDatabase(archive, "archive.sql");
    RunSql(archive, "UPDATE db_info SET device = 'nas'");
    CreateLogDatabase(archive, "archive.sql"); // once more: keeps what is there
    EXPECT_EQ(RunSql(archive, "SELECT group_concat(device) FROM db_info"), "nas");
    const std::string definitions = "SELECT group_concat(name || sql, ';') FROM (SELECT * FROM sqlite_master "
                                    "WHERE tbl_name = 'logs' ORDER BY name)";
    for (const char *index : {"logs_host_idx", "logs_prog_idx", "logs_ldate_idx", "logs_utcsec_idx"})
        EXPECT_THAT(RunSql(path_, definitions), HasSubstr(index));
    EXPECT_EQ(RunSql(archive, definitions), RunSql(path_, definitions));
    EXPECT_EQ(SyslogDBVersionGet(path_), 2);
    EXPECT_EQ(SyslogDBVersionGet(archive), 1);
}

TEST_F(Schema, NeverUsesAnIdAgain) {
    InsertSampleLogs(path_, 3);
    EXPECT_EQ(SyslogDBDelete(path_, {}), 0);
    EXPECT_EQ(TakeStatement(), "DELETE FROM logs");
    InsertSampleLogs(path_, 1);
    EXPECT_EQ(RunSql(path_, "SELECT group_concat(id) FROM logs"), "4");
}

} // namespace
