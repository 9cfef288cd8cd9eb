#include <array>

#include "keloplatform/gensqlregexp.h"
#include "query/query_fixture.h"

namespace kelo::test {
namespace {

using ConditionText = QueryTest;

// A count sends the conditions behind this text.
constexpr char kCount[] = "SELECT COUNT(*) FROM logs WHERE ";

TEST_F(ConditionText, EscapesAndQuotesByOperatorAndColumn) {
    const std::pair<_SYSLOG_SQL_COND_tag, std::string> cases[] = {
        {{SYSLOG_ATTRI_HOST, SYSLOG_OP_EQ, "", {}}, "(host = '')"},
        {{SYSLOG_ATTRI_HOST, SYSLOG_OP_NE, "O'Brien", {}}, "(host != 'O''Brien')"},
        {{SYSLOG_ATTRI_PROG, SYSLOG_OP_LE, "''", {}}, "(prog <= '''''')"},
        {{SYSLOG_ATTRI_ISDIR, SYSLOG_OP_GE, "1", {}}, "(isdir >= '1')"},
        {{SYSLOG_ATTRI_XFERIP, SYSLOG_OP_LT, "1%_[\\", {}}, "(ip < '1%_[\\')"},
        {{SYSLOG_ATTRI_MSG, SYSLOG_OP_LIKE, "a*b?c", {}}, "(msg LIKE 'a%b_c' escape '\\')"},
        {{SYSLOG_ATTRI_MSG, SYSLOG_OP_NOT_LIKE, "5%_\\'*", {}},
         "(msg NOT LIKE '5\\%\\_\\\\''%' escape '\\')"},
        {{SYSLOG_ATTRI_MSG, SYSLOG_OP_GLOB, "x[1]*?'", {}}, "(msg GLOB 'x[[]1[]]*?''')"},
        {{SYSLOG_ATTRI_MSG, SYSLOG_OP_NOT_GLOB, "%_\\", {}}, "(msg NOT GLOB '%_\\')"},
        {{SYSLOG_ATTRI_MSG, SYSLOG_OP_RAW, "msg > 'it''s'", {}}, "(msg > 'it''s')"},
        {{SYSLOG_ATTRI_ID, SYSLOG_OP_GT, "15", {}}, "(id > 15)"},
        {{SYSLOG_ATTRI_UTCSEC, SYSLOG_OP_LIKE, "1?*", {}}, "(utcsec LIKE 1_%)"},
        {{SYSLOG_ATTRI_MSG,
          SYSLOG_OP_RAW,
          "1",
          {{SYSLOG_ATTRI_ID, SYSLOG_OP_EQ, "2", {{SYSLOG_ATTRI_ID, SYSLOG_OP_EQ, "3", {}}}},
           {SYSLOG_ATTRI_MSG, SYSLOG_OP_LIKE, "*", {}}}},
         "((1) OR (id = 2) OR (msg LIKE '%' escape '\\'))"},
    };
    for (const auto &[condition, text] : cases) {
        SyslogDBSelectCount(path_, {condition}, nullptr, nullptr);
        EXPECT_EQ(TakeStatement(), kCount + text);
    }
    SyslogDBSelectCount(path_, {cases[0].first, cases[1].first}, nullptr, nullptr);
    EXPECT_EQ(TakeStatement(), kCount + cases[0].second + " AND " + cases[1].second);
}

TEST_F(ConditionText, FailsForWhatSqlHasNoTextFor) {
    InsertSampleLogs(path_, 3);
    const auto noAttribute = static_cast<_SYSLOG_DB_ATTRI_tag>(-1);
    const _SYSLOG_SQL_COND_tag plain{SYSLOG_ATTRI_ID, SYSLOG_OP_GT, "0", {}};
    const _SYSLOG_SQL_COND_tag bad[] = {
        {SYSLOG_ATTRI_HOST, static_cast<_SYSLOG_SQL_OP_tag>(11), "1", {}},
        {SYSLOG_ATTRI_ID, SYSLOG_OP_RAW, "", {}},
        {SYSLOG_ATTRI_NONE, SYSLOG_OP_EQ, "1", {}},
        {noAttribute, SYSLOG_OP_RAW, "1", {}},
        {SYSLOG_ATTRI_MSG, SYSLOG_OP_RAW, std::string("1)\0", 3), {}}, // must not cut the statement
        {SYSLOG_ATTRI_HOST, SYSLOG_OP_EQ, "1", {{SYSLOG_ATTRI_HOST, SYSLOG_OP_RAW, "1", {}}}},
        {SYSLOG_ATTRI_HOST, SYSLOG_OP_GE, std::string("zz\0", 3), {}}, // must not become >= 'zz', nor >= ''
        {SYSLOG_ATTRI_HOST, SYSLOG_OP_EQ, "1", {{SYSLOG_ATTRI_MSG, SYSLOG_OP_LIKE, {"a\0", 2}, {}}}},
    };
    for (const auto &condition : bad) {
        EXPECT_EQ(SyslogDBSelectCount(path_, {plain, condition}, nullptr, nullptr), -1);
        EXPECT_EQ(SyslogDBDelete(path_, {condition, plain}), -1);
    }
    PlatformCalls::FailFrom(1, 1); // the value cannot be escaped
    EXPECT_EQ(SyslogDBDelete(path_, {{SYSLOG_ATTRI_HOST, SYSLOG_OP_GE, "zz", {}}}), -1);
    _SYSLOG_SQL_ORDER_tag order{1, noAttribute};
    EXPECT_EQ(SyslogDBSelectCount(path_, {plain}, nullptr, &order), -1);
    EXPECT_EQ(SyslogDBDelete(path_, {{SYSLOG_ATTRI_HOST, SYSLOG_OP_EQ, "", {}}}), 0)
        << "the empty text is one";
    EXPECT_EQ(SyslogDBSelectCount(path_, {plain}, nullptr, nullptr), 3);
}

TEST_F(ConditionText, IsBuiltFromTheFilterForm) {
    const std::string keyword = GenSQLRegexp("any", "msg");
    // Host, level, facility, program, keyword, from, to.
    const std::pair<std::array<std::string, 7>, std::string> cases[] = {
        {{"any", "any", "", "any", "", "0", ""}, ""},
        {{"a, b", "err,warning", "auth", "x", "any", "2020/01/02", "2020/01/03"},
         "((host = 'a') OR (host = ' b')) AND ((llevel = 'err') OR (llevel = 'warning')) AND (fac = 'auth') "
         "AND "
         "(prog = 'x') AND (" +
             keyword + ") AND (ldate >= '2020/01/02') AND (ldate <= '2020/01/03')"},
        {{",", "Any", "", "", "", "d", "d"},
         "((host = '') OR (host = '')) AND (llevel = 'Any') AND (ldate = 'd')"},
        {{"", "", "", "", "", "0", "d"}, "(ldate <= 'd')"},
    };
    for (const auto &[form, text] : cases) {
        Conditions conditions = {{SYSLOG_ATTRI_ID, SYSLOG_OP_GT, "1", {}}};
        LogSearchCondListGen(form[0], form[1], form[2], form[3], form[4], form[5], form[6], conditions);
        SyslogDBSelectCount(path_, conditions, nullptr, nullptr);
        EXPECT_EQ(TakeStatement(), kCount + std::string("(id > 1)") + (text.empty() ? "" : " AND " + text));
    }
}

} // namespace
} // namespace kelo::test
