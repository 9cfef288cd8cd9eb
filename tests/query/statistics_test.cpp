#include "query/query_fixture.h"

namespace kelo::test {
namespace {

class Statistics : public QueryTest {
protected:
    Statistics() {
        RunSql(path_, "CREATE TABLE histogram(id INTEGER PRIMARY KEY, device TEXT, count INTEGER);"
                      "CREATE TABLE eps(id INTEGER PRIMARY KEY, stamp INTEGER, device TEXT, eps INTEGER);");
        PlatformCalls::Reset();
    }
};

TEST_F(Statistics, ReadTheHistogram) {
    EXPECT_EQ(SyslogDBHistTotalGet(path_), 0u);
    EXPECT_EQ(TakeStatement(), "SELECT SUM(count) FROM histogram");
    RunSql(path_,
           "INSERT INTO histogram(device, count) VALUES('nas', 7), (NULL, 1), ('a''b', 5), ('nas', 90), "
           "('big', 9223372036854775000)");
    EXPECT_THAT(SyslogDBHistGet(path_, 0),
                ElementsAre(Pair("", 1), Pair("a'b", 5), Pair("big", 9223372036854775000u), Pair("nas", 7)));
    EXPECT_EQ(TakeStatement(), "SELECT * FROM histogram");
    EXPECT_THAT(SyslogDBHistGet(path_, 2), ElementsAre(Pair("big", 9223372036854775000u), Pair("nas", 90)));
    EXPECT_EQ(TakeStatement(), "SELECT * FROM histogram ORDER BY count DESC LIMIT 2");
    EXPECT_THAT(SyslogDBHistGet(path_, -1), IsEmpty());
    EXPECT_EQ(TakeStatement(), "SELECT * FROM histogram ORDER BY count DESC LIMIT 18446744073709551615");
    EXPECT_EQ(SyslogDBHistTotalGet(path_), 9223372036854775103u);
    TakeStatement();
    EXPECT_EQ(SyslogDBHistGetSingle(path_, "a'b"), 0u);
    EXPECT_EQ(TakeStatement(), "SELECT * FROM histogram WHERE device = 'a'b'");
    EXPECT_EQ(SyslogDBHistGetSingle(path_, "a''b"), 5u);
    EXPECT_EQ(SyslogDBHistGetSingle(path_, "nothing"), 0u);
    EXPECT_THAT(TakeTexts(), IsEmpty());
}

TEST_F(Statistics, SumASampleButKeepTheFirstRowOfADevice) {
    RunSql(
        path_,
        "INSERT INTO eps(stamp, device, eps) VALUES(20, 'b', 3), (10, 'a', 1), (20, 'a', 4), (20, 'b', 9), "
        "(9999999999, NULL, 9999999999), (20, NULL, 2147483647)");
    const std::map<int, SYSLOG_LOG_EPS> samples = SyslogDBEpsGet(path_, 11, 20);
    EXPECT_EQ(TakeStatement(), "SELECT * FROM eps WHERE stamp >=11 and stamp <=20");
    ASSERT_EQ(samples.size(), 1u);
    EXPECT_EQ(samples.at(20).stamp, 20);
    EXPECT_EQ(samples.at(20).eps, 2147483663);
    EXPECT_THAT(samples.at(20).devices, ElementsAre(Pair("", 2147483647), Pair("a", 4), Pair("b", 3)));
    // A negative bound is a huge number; a stamp beyond 32 bits saturates.
    RunSql(path_, "UPDATE eps SET stamp = 9999999999 WHERE stamp = 10");
    const std::map<int, SYSLOG_LOG_EPS> beyond = SyslogDBEpsGet(path_, 21, -1);
    EXPECT_EQ(TakeStatement(), "SELECT * FROM eps WHERE stamp >=21 and stamp <=18446744073709551615");
    ASSERT_THAT(beyond, ElementsAre(Pair(2147483647, testing::_)));
    EXPECT_EQ(beyond.at(2147483647).eps, 2147483648);
    EXPECT_THAT(SyslogDBEpsGet(path_, 20, 11), IsEmpty());
}

using Lookup = QueryTest;

TEST_F(Lookup, ListsTheValuesOfAnAttribute) {
    RunSql(path_, "INSERT INTO logs(host) VALUES('b'), ('a'), (NULL), ('b'), ('c')");
    std::list<std::string> values = {"before"};
    EXPECT_EQ(SyslogDBAttriValueGet(path_, "host", nullptr, values), 0);
    EXPECT_EQ(TakeStatement(), "SELECT host FROM logs GROUP BY host ORDER BY host asc");
    _SYSLOG_SQL_LIMIT_tag page{1, 0x500000002};
    EXPECT_EQ(SyslogDBAttriValueGet(path_, "host", &page, values), 0);
    EXPECT_EQ(PlatformCalls::Recorded()[1].offset, 2u);
    EXPECT_THAT(values, ElementsAre("before", "", "a", "b", "c", "b"));
    EXPECT_EQ(SyslogDBAttriValueGet(path_, "event", nullptr, values), -1);
    EXPECT_THAT(TakeTexts(), IsEmpty());
    EXPECT_EQ(SyslogDBAttriValueGet(path_, "host, msg", nullptr, values), -1);
    EXPECT_THAT(TakeTexts(), ElementsAre("dbutil:710 Log attribute type is incorrect!"));
}

TEST_F(Lookup, NumbersTheNamesOfADatabaseWithoutKeyTables) {
    RunSql(path_, "INSERT INTO logs(fac) VALUES('user'), ('auth'), ('user'), (NULL)");
    std::map<uint64_t, std::string> names = {{1, "kept"}};
    EXPECT_EQ(SyslogDBExtkeyMapGet(path_, SYSLOG_EXTKEY_FAC, names), 0);
    EXPECT_THAT(PlatformCalls::Texts(),
                ElementsAre("SELECT * FROM db_info", "SELECT DISTINCT fac FROM logs"));
    EXPECT_THAT(names, ElementsAre(Pair(0, "user"), Pair(1, "kept"), Pair(2, "")));
    EXPECT_EQ(SyslogDBExtkeyLookupByName(path_, SYSLOG_EXTKEY_FAC, "auth"), 1u);
}

TEST_F(Lookup, ReadsTheKeyTablesOfTheFirstGeneration) {
    EXPECT_EQ(SyslogDBVersionGet(path_), 2);
    RunSql(path_, "CREATE TABLE db_info(x)");
    EXPECT_EQ(SyslogDBVersionGet(path_), 1);
    EXPECT_EQ(SyslogDBExtkeyLookupByName(path_, SYSLOG_EXTKEY_HOST, "x"), 0u);
    EXPECT_THAT(TakeTexts(), ElementsAre("dbutil:966 Fail to get foreign key map"));
    for (const auto &[type, kind] :
         std::map<_SYSLOG_EXTKEY_TB_TYPE_tag, std::string>{{SYSLOG_EXTKEY_HOST, "host"},
                                                           {SYSLOG_EXTKEY_PROG, "prog"},
                                                           {SYSLOG_EXTKEY_TAG, "tag"},
                                                           {SYSLOG_EXTKEY_FAC, "fac"}}) {
        RunSql(path_, "CREATE TABLE " + kind + "s(" + kind + "_id, " + kind + "_name); INSERT INTO " + kind +
                          "s VALUES(9, 'x'), (5, 'x'), (5, 'y'), (7, NULL)");
        EXPECT_EQ(SyslogDBExtkeyLookupByName(path_, type, "x"), 5u) << kind;
        EXPECT_EQ(SyslogDBExtkeyLookupByName(path_, type, ""), 7u);
        EXPECT_EQ(SyslogDBExtkeyLookupByName(path_, type, "y"), 0u);
    }
    std::map<uint64_t, std::string> names;
    EXPECT_EQ(SyslogDBExtkeyMapGet(path_, static_cast<_SYSLOG_EXTKEY_TB_TYPE_tag>(4), names), -1);
}

TEST_F(Lookup, NeverMeetsAnIdAgain) {
    InsertSampleLogs(path_, 3);
    EXPECT_EQ(SyslogDBDelete(path_, {}), 0);
    EXPECT_EQ(TakeStatement(), "DELETE FROM logs");
    InsertSampleLogs(path_, 1);
    EXPECT_EQ(RunSql(path_, "SELECT group_concat(id) FROM logs"), "4");
}

} // namespace
} // namespace kelo::test
