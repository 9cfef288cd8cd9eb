#include <cstring>

#include "eventlog/event_fixture.h"

namespace kelo::test {
namespace {

class Enumeration : public EventTest {
protected:
    std::string Ids(int offset, int limit) {
        std::string ids;
        for (const _SSYSLOG_LOG_LOG_tag &event : logger_.LogEnum(db_, offset, limit))
            ids += std::to_string(event.id) + " ";
        return ids;
    }
};

TEST_F(Enumeration, GivesPagesNewestFirstAndNothingWhereItFails) {
    CreateEvents(6);
    RunSql(db_, "UPDATE log SET time = 1004 WHERE id = 1; DELETE FROM log WHERE id = 2");
    const std::tuple<int, int, std::string> cases[] = {
        {0, 0, "6 5 1 4 3 "}, {3, 0, "6 5 1 4 3 "}, {1, 2, "5 1 "}, {4, 10, "3 "}, {20, 10, ""},
    };
    for (const auto &[offset, limit, ids] : cases)
        EXPECT_EQ(Ids(offset, limit), ids) << limit << " after " << offset;
    EXPECT_THAT(TakeTexts(), IsEmpty());
    EXPECT_EQ(Ids(0, -1), "");
    EXPECT_THAT(TakeTexts(), ElementsAre("Fail to execute SQL command SELECT * FROM log ORDER BY time DESC "
                                         "LIMIT 18446744073709551615 OFFSET 0"));
    PlatformCalls::FailFrom(1, 1);
    EXPECT_EQ(Ids(0, 0), "");
    EXPECT_THAT(TakeTexts(), ElementsAre("Fail to open db: " + db_, "Fail to connect db"));
    PlatformCalls::FailFrom(5, 1);
    EXPECT_EQ(Ids(0, 0), "6 5 ") << "the rows up to one that cannot be fetched";
}

TEST_F(Enumeration, ReadsFieldsAsNumbersAndTextWhateverTheTableHolds) {
    EXPECT_EQ(logger_.LogAddVolFull(), 0);
    RunSql(db_, "DROP TABLE log; CREATE TABLE log (id, time, user, event);"
                "INSERT INTO log VALUES ('4294967298x', '99999999999', NULL, '<b>')");
    const std::list<_SSYSLOG_LOG_LOG_tag> events = logger_.LogEnum(db_, 0, 0);
    ASSERT_EQ(events.size(), 1U);
    EXPECT_EQ(events.front().id, 2);
    EXPECT_EQ(events.front().level, 0);
    EXPECT_EQ(events.front().time, 99999999999);
    EXPECT_EQ(events.front().user, "");
    EXPECT_EQ(events.front().event, "<b>");
}

// The schema keeps what a rotation and a page send from reading or sorting whole rows.
TEST_F(Enumeration, FindsItsRowsThroughTheIndexOnTime) {
    CreateEvents(3000);
    TestDatabase db(db_);
    const auto take = [](void *text, int, char **values, char **) {
        *static_cast<std::string *>(text) += values[3];
        return 0;
    };
    for (const std::string sql :
         {"SELECT time FROM log ORDER BY time DESC LIMIT 1 OFFSET 18000", "DELETE FROM log WHERE time <= 0",
          "SELECT COUNT(*) FROM log", "SELECT * FROM log ORDER BY time DESC LIMIT 50 OFFSET 100"}) {
        std::string plan;
        EXPECT_EQ(sqlite3_exec(db.Get(), ("EXPLAIN QUERY PLAN " + sql).c_str(), take, &plan, nullptr),
                  SQLITE_OK);
        EXPECT_THAT(plan, HasSubstr("INDEX log_time")) << sql;
        EXPECT_THAT(plan, Not(HasSubstr("TEMP B-TREE"))) << sql;
    }
}

TEST_F(Enumeration, WritesThePageInLocalTime) {
    const std::string page = root_.File("page.html");
    EXPECT_EQ(logger_.LogHtmlGen(db_, "x", page), 0);
    EXPECT_EQ(access(page.c_str(), F_OK), -1) << "no events, no file";
    RunSql(db_, "INSERT INTO log VALUES (1, 7, 1577836800, '', ''), (2, 2, 1593561600, '', '')");
    EXPECT_EQ(logger_.LogHtmlGen("", "x", page), -1);
    EXPECT_EQ(logger_.LogHtmlGen(db_, "", page), -1);
    EXPECT_EQ(logger_.LogHtmlGen(db_, "x", ""), -1);
    EXPECT_EQ(logger_.LogHtmlGen(db_, "x", root_.File("none/page.html")), 0);
    setenv("TZ", "CET-1CEST,M3.5.0,M10.5.0/3", 1); // not yet known to the C library
    WriteFile(page, std::string(100000, 'x'));
    EXPECT_EQ(logger_.LogHtmlGen(db_, "x", page), 0);
    setenv("TZ", "UTC0", 1);
    const std::string text = ReadFile(page);
    EXPECT_THAT(text,
                AllOf(HasSubstr("<th>User</th><th>Event</th></tr>"),
                      HasSubstr("Error</td>\n<td align=\"center\">2020-07-01T02:00:00<"),
                      HasSubstr("<td align=\"center\"></td>\n<td align=\"center\">2020-01-01T01:00:00<"),
                      Not(HasSubstr("xxx"))));
}

TEST(Levels, AreCutToTheBuffer) {
    for (const auto &[size, text] : {std::pair(64, "Warning"), {4, "War"}, {1, ""}, {0, "unchanged"}}) {
        char buffer[64] = "unchanged";
        EXPECT_EQ(szLevelGet(1, buffer, size), 0);
        EXPECT_STREQ(buffer, text) << size;
    }
    EXPECT_EQ(strLevelGet(-1) + strLevelGet(3), "");
}

} // namespace
} // namespace kelo::test
