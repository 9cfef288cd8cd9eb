#include "read/log_filter.h"

#include "base/errors.h"
#include "read/log_reader.h"
#include "read/severity_filter.h"
#include "support/test.h"

namespace kelo::tool {
namespace {

using Log = _SYSLOG_LOG_DATA_tag;
using Values = std::vector<std::string>;

constexpr int64_t kEpoch = 1577836800; // of the first sample log

class SelectionTest : public testing::Test {
protected:
    SelectionTest() {
        table_.path = root_.File("logs.db");
        test::CreateLogDatabase(table_.path);
    }

    std::vector<uint64_t> Ids(const LogFilter &filter) const {
        std::vector<uint64_t> ids;
        const LogReader reader(table_, MakeConditions(filter, table_, kEpoch));
        reader.ReadPage({}, true, [&](const Log &log) { ids.push_back(log.id); });
        EXPECT_EQ(reader.Count(), ids.size());
        return ids;
    }

    test::TempRoot root_;
    LogTable table_;
};

// Each option against a filter in plain C++ over the same records.
TEST_F(SelectionTest, FindsWhatANaiveFilterFinds) {
    std::vector<Log> logs;
    for (int number = 0; number < 400; ++number)
        logs.push_back(test::SampleLog(number));
    logs[7].host = "na[s]*'";
    test::InsertLogs(table_.path, logs);

    const struct {
        LogFilter filter;
        std::function<bool(const Log &)> matches;
    } kCases[] = {
        {{.hosts = {"host01,host02", "host03"}},
         [](const Log &log) { return log.host >= "host01" && log.host <= "host03"; }},
        {{.hosts = {"host1*,!host?2"}},
         [](const Log &log) { return log.host.starts_with("host1") && log.host != "host12"; }},
        {{.hosts = {"!na[s]?'"}}, [](const Log &log) { return !log.host.starts_with("na"); }},
        {{.programs = {"!prog00"}, .keywords = {"*"}}, [](const Log &log) { return log.prog != "prog00"; }},
        {{.severities = {"info..warning"}}, [](const Log &log) { return log.prio >= 4 && log.prio <= 6; }},
        {{.severities = {"!debug,!emerg..crit"}},
         [](const Log &log) { return log.prio > 2 && log.prio < 7; }},
        {{.severities = {"warn,!alert"}}, [](const Log &log) { return log.prio <= 4 && log.prio != 1; }},
        {{.facilities = {"local0,23,!local7"}}, [](const Log &log) { return log.fac == "local0"; }},
        {{.keywords = {"failed"}},
         [](const Log &log) { return log.msg.find("FAILED") != std::string::npos; }},
        {{.since = "@1577836810", .until = "@1577836820"},
         [](const Log &log) { return log.utcsec >= kEpoch + 10 && log.utcsec <= kEpoch + 20; }},
    };
    for (const auto &test : kCases) {
        SCOPED_TRACE(&test - kCases);
        std::vector<uint64_t> expected;
        for (size_t i = 0; i < logs.size(); ++i) {
            if (test.matches(logs[i]))
                expected.push_back(i + 1);
        }
        EXPECT_EQ(Ids(test.filter), expected);
    }
}

TEST_F(SelectionTest, KeepsRowsWithoutAValueWhenSomethingElseIsExcluded) {
    test::RunSql(table_.path,
                 "INSERT INTO logs(id,host,llevel) VALUES(1,NULL,NULL),(2,'a','err'),(3,'b','7')");
    EXPECT_EQ(Ids({.severities = {"!err"}, .hosts = {"!b"}}), (std::vector<uint64_t>{1}));
}

TEST_F(SelectionTest, BoundsTablesWithoutUtcsecByTheirDateAndTime) {
    test::RunSql(
        table_.path,
        "CREATE TABLE general_log(id INTEGER PRIMARY KEY,host,llevel,prog,ldate,ltime,luser,msg);"
        "INSERT INTO general_log(id,llevel,ldate,ltime,msg) VALUES(1,'err','2019/12/31','23:59:59','a'),"
        "(2,'info','2020/01/01','00:00:00','b'),(3,'err','2020/01/01','10:00:00','c'),"
        "(4,'err','2020/01/02','00:00:00','d')");
    table_.name = "general_log";
    table_.kind = TableKind::System;
    EXPECT_EQ(Ids({.since = "2020-01-01", .until = "2020-01-02"}), (std::vector<uint64_t>{2, 3}));
    EXPECT_EQ(Ids({.until = "2020-01-02 00:00", .severities = {"err"}}), (std::vector<uint64_t>{1, 3, 4}));
    EXPECT_THROW(MakeConditions({.facilities = {"kern"}}, table_, kEpoch), UsageError);
    table_.kind = TableKind::Transfer;
    EXPECT_THROW(MakeConditions({.keywords = {"x"}}, table_, kEpoch), UsageError);
}

// Each would select more than the user meant.
TEST_F(SelectionTest, RefusesValuesThatSayNothing) {
    std::string many = "a";
    for (int i = 0; i < 500; ++i)
        many += ",a";
    for (const std::string &value : {std::string(), std::string("a,,b"), std::string("!"), many})
        EXPECT_THROW(MakeConditions({.hosts = {value}}, table_, kEpoch), UsageError) << value;
    for (const char *level : {"8", "-1", "errr", "err..", "..err", "err..x", "err...info", "!"})
        EXPECT_THROW(ParseSeverities({level}), UsageError) << level;
    EXPECT_THROW(MakeConditions({.keywords = {" \t"}}, table_, kEpoch), UsageError);
    EXPECT_NO_THROW(Ids({.hosts = Values(500, "a")}));
}

} // namespace
} // namespace kelo::tool
