#include "db/db_fixture.h"

namespace kelo::test {
namespace {

class DbInfo : public DbTest {
protected:
    DbInfo() { SetZone("IST-5:30"); }
    ~DbInfo() override { SetZone("UTC0"); }
    static void SetZone(const char *zone) {
        setenv("TZ", zone, 1);
        tzset();
    }
};

TEST_F(DbInfo, ReadsThe32BitTimesAndThe64BitCount) {
    Connect();
    RunSql(path_, "DROP TABLE db_info; CREATE TABLE db_info (start_time, end_time, log_count, device);"
                  "INSERT INTO db_info VALUES (2147483648, '-99999999999x', '18446744073709551615', NULL)");
    _ARCH_DB_INFO_tag info{1, 2, 3, "before"};
    EXPECT_EQ(db_.DBInfoGet(info), 0);
    EXPECT_EQ(info.start_time, 2147483647);
    EXPECT_EQ(info.end_time, -2147483648LL);
    EXPECT_EQ(info.log_count, 18446744073709551615ULL);
    EXPECT_EQ(info.device, "");
    RunSql(path_, "DELETE FROM db_info");
    EXPECT_EQ(db_.DBInfoGet(info), 0);
    EXPECT_EQ(info.start_time, 0);
    info.device = "kept";
    RunSql(path_, "DROP TABLE db_info");
    Take();
    EXPECT_EQ(db_.DBInfoGet(info), -1);
    EXPECT_EQ(info.device, "kept");
    EXPECT_EQ(Take().back(), "Fail to execute SQL command: SELECT * FROM db_info");
}

TEST_F(DbInfo, ComputesCountAndTimesFromTheLogs) {
    Connect(3); // the first at 2020/01/01 00:00:00 UTC
    EXPECT_EQ(db_.DBLogCountGet(), 3);
    EXPECT_EQ(db_.DBInfoCntGet(), 3);
    EXPECT_EQ(db_.DBInfoStartGet(), 1577836800);
    EXPECT_EQ(db_.DBInfoEndGet(), 1577836802);
    RunSql(path_, "UPDATE logs SET utcsec = 4000000000 WHERE id = 3;"
                  "UPDATE logs SET utcsec = 1577817000 WHERE id = 1");
    EXPECT_EQ(db_.DBLogEndTimeGet(), 2147483647);
    EXPECT_EQ(db_.DBInfoEndStrGet(), "2038-01-19");
    EXPECT_EQ(db_.DBInfoStartStrGet(), "2020-01-01"); // the day before in UTC
    EXPECT_THAT(Take(), IsEmpty());

    RunSql(path_, "DELETE FROM logs");
    EXPECT_EQ(db_.DBLogCountGet(), 0);
    EXPECT_EQ(db_.DBLogStartTimeGet(), 0);
    EXPECT_THAT(Take(), IsEmpty());
    EXPECT_EQ(db_.DBInfoStartStrGet(), "1970-01-01");
    EXPECT_EQ(db_.DBInfoEndStrGet(), "1970-01-01");
    EXPECT_THAT(Take(), ElementsAre("Fail to get database start time", "Fail to get database end time"));
}

} // namespace
} // namespace kelo::test
