#include <cstdlib>
#include <ctime>

#include "db/db_fixture.h"

namespace kelo::test {
namespace {

using testing::ElementsAre;
using testing::IsEmpty;

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
    const struct {
        const char *row; // start_time, end_time, log_count, device
        _ARCH_DB_INFO_tag wanted;
    } cases[] = {
        {"1577836800, 1600000000, 18446744073709551615, 'nas'", {1577836800, 1600000000, 0, "nas"}},
        {"2147483648, -99999999999, '18446744073709551615', NULL",
         {2147483647, -2147483648LL, 18446744073709551615ULL, ""}},
        {"'12abc', '', 'x', ''", {12, 0, 0, ""}},
    };
    for (const auto &c : cases) {
        SCOPED_TRACE(c.row);
        RunSql(path_,
               std::string("DROP TABLE db_info; CREATE TABLE db_info (id INTEGER, start_time, end_time, "
                           "log_count, device); INSERT INTO db_info VALUES (1, ") +
                   c.row + ")");
        _ARCH_DB_INFO_tag info;
        EXPECT_EQ(db_.DBInfoGet(info), 0);
        EXPECT_EQ(info.start_time, c.wanted.start_time);
        EXPECT_EQ(info.end_time, c.wanted.end_time);
        if (c.wanted.log_count != 0) {
            EXPECT_EQ(info.log_count, c.wanted.log_count);
        }
        EXPECT_EQ(info.device, c.wanted.device);
    }
    _ARCH_DB_INFO_tag info{1, 2, 3, "kept"};
    RunSql(path_, "DELETE FROM db_info");
    EXPECT_EQ(db_.DBInfoGet(info), 0);
    EXPECT_EQ(info.start_time, 0);
    EXPECT_EQ(info.device, "");
    info.device = "kept";
    RunSql(path_, "DROP TABLE db_info");
    Messages();
    EXPECT_EQ(db_.DBInfoGet(info), -1);
    EXPECT_EQ(info.device, "kept");
    EXPECT_EQ(Messages().back(), Error("Fail to execute SQL command: SELECT * FROM db_info"));
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
    EXPECT_THAT(Messages(), IsEmpty());

    RunSql(path_, "DELETE FROM logs");
    EXPECT_EQ(db_.DBLogCountGet(), 0);
    EXPECT_EQ(db_.DBLogStartTimeGet(), 0);
    EXPECT_THAT(Messages(), IsEmpty());
    EXPECT_EQ(db_.DBInfoStartStrGet(), "1970-01-01");
    EXPECT_EQ(db_.DBInfoEndStrGet(), "1970-01-01");
    EXPECT_THAT(Messages(), ElementsAre(Error("Fail to get database start time"),
                                        Error("Fail to get database end time")));
}

} // namespace
} // namespace kelo::test
