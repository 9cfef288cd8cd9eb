// The reason of a failure that a program can read.

#include "kelosyslog/failure.h"
#include "kelosyslog/logger.h"
#include "query/query_fixture.h"

namespace kelo::test {
namespace {

struct FailureCase {
    KELOFAILUREKIND kind;
    const char *path; // in the root
    std::function<void(const std::string &path)> run;
    const char *tried;
    const char *text;
};

Conditions Raw(const char *sql) {
    return {{SYSLOG_ATTRI_MSG, SYSLOG_OP_RAW, sql, {}}};
}

void Count(const std::string &path) {
    SyslogDBSelectCount(path, {}, nullptr, nullptr);
}

const FailureCase kFailures[] = {
    {KELO_FAILURE_MISSING, "none.db", Count, "KELODBConnect", "No such file or directory"},
    {KELO_FAILURE_MISSING, "text/a.db", Count, "KELODBConnect", "Not a directory"},
    {KELO_FAILURE_ARGUMENT, ".", Count, "KELODBConnect", "Is a directory"},
    {KELO_FAILURE_DAMAGED, "text", Count, "SELECT max(rowid) FROM logs", "file is not a database"},
    {KELO_FAILURE_TABLE, "empty", Count, "SELECT max(rowid) FROM logs", "no such table: logs"},
    {KELO_FAILURE_COLUMN, "logs.db", [](const std::string &path) { SyslogDBDelete(path, Raw("colour = 1")); },
     "DELETE FROM logs WHERE (colour = 1)", "no such column: colour"},
    {KELO_FAILURE_COLUMN, "logs.db",
     [](const std::string &path) {
         std::list<std::string> values;
         SyslogDBAttriValueGet(path, "colour", nullptr, values);
     },
     "colour", "no log table has this column"},
    {KELO_FAILURE_REGEX, "logs.db",
     [](const std::string &path) {
         InsertSampleLogs(path, 1);
         SyslogDBDelete(path, Raw("regexp('(', msg)"));
     },
     "DELETE FROM logs WHERE (regexp('(', msg))", "regular expression /(/: missing ): ("},
    {KELO_FAILURE_STATEMENT, "logs.db", [](const std::string &path) { SyslogDBHistGetSingle(path, "it's"); },
     "SELECT * FROM histogram WHERE device = 'it's'", "near \"s\": syntax error"},
    {KELO_FAILURE_TABLE, "logs.db", [](const std::string &path) { Logger().LogCount(path); },
     "SELECT COUNT(*) FROM log", "no such table: log"},
    {KELO_FAILURE_ARGUMENT, "logs.db",
     [](const std::string &path) {
         SyslogDBDelete(path, {{SYSLOG_ATTRI_HOST, SYSLOG_OP_EQ, std::string("a\0b", 3), {}}});
     },
     "a", "the value of a condition holds a NUL byte"},
};

TEST_F(QueryTest, AFailureHasAReasonThatASuccessKeeps) {
    WriteFile(root_.File("text"), std::string(5000, 'x'));
    WriteFile(root_.File("empty"), "");
    for (const FailureCase &expected : kFailures) {
        SCOPED_TRACE(expected.text);
        const std::string path = root_.File(expected.path);
        SyslogFailureClear();
        expected.run(path);
        EXPECT_GE(SyslogDBSelectCount(path_, {}, nullptr, nullptr), 0);
        const KELOFAILURE &failure = *SyslogFailureGet();
        EXPECT_EQ(failure.kind, expected.kind);
        EXPECT_STREQ(failure.tried, expected.tried);
        EXPECT_STREQ(failure.text, expected.text);
        EXPECT_TRUE(failure.path == path || expected.tried == std::string("a")) << failure.path;
    }
}

TEST_F(QueryTest, ABrokenRegexIsTheReasonOfAFormWithoutMatches) {
    Conditions conditions;
    SyslogFailureClear();
    LogSearchCondListGen("", "", "", "", "/fail(ed/", "", "", conditions);
    EXPECT_EQ(SyslogFailureGet()->kind, KELO_FAILURE_REGEX);
    EXPECT_THAT(SyslogFailureGet()->text, HasSubstr("[fail(ed]"));
    SyslogFailureClear();
    LogSearchCondListGen("", "", "", "", "/failed/", "", "", conditions);
    EXPECT_EQ(SyslogFailureGet()->kind, KELO_FAILURE_NONE);
}

} // namespace
} // namespace kelo::test
