#include <limits>

#include "kelosyslog/dbutil.h"
#include "support/test.h"

namespace {

using namespace kelo::test;

const std::string kEveryColumn =
    "'7' id, 'h' host, '10.0.0.1' ip, '86' tag, '+08:00' tzoffset, '2020/01/02' ldate, '10:11:12' ltime, "
    "'sshd' prog, 'root: hi: there' msg, '-5' utcsec, 'auth' fac, 'err' prio, 'crit' llevel, 'luser' luser, "
    "'write' event, 'file' fname, '1' isdir, '12 KB' fsize";

int TakeText(_SYSLOG_LOG_DATA_tag &log, void *context) {
    auto &text = *static_cast<std::string *>(context);
    for (const int64_t number : {static_cast<int64_t>(log.id), log.utcsec, static_cast<int64_t>(log.prio),
                                 static_cast<int64_t>(log.isdir)})
        text += std::to_string(number) + "|";
    for (const std::string *field :
         {&log.tag, &log.host, &log.ip, &log.fac, &log.tzoffset, &log.ldate, &log.ltime, &log.prog, &log.msg,
          &log.luser, &log.event, &log.xferip, &log.fname, &log.fsize})
        text += *field + "|";
    return 0;
}

TEST(Vocabulary, HasAnAnswerForEveryNumber) {
    EXPECT_STREQ(LogAttriStrGet(SYSLOG_ATTRI_XFERIP), "ip");
    EXPECT_EQ(PriorTypeToStr(SYSLOG_PRIO_DEBUG), "debug");
    for (const int32_t number : {-1, 19, 20, std::numeric_limits<int32_t>::max()}) {
        EXPECT_STREQ(LogAttriStrGet(static_cast<_SYSLOG_DB_ATTRI_tag>(number)), "");
        EXPECT_EQ(PriorTypeToStr(static_cast<_SYSLOG_DB_PRIORITY_tag>(number)), "");
    }
}

TEST(DBRecToLogInfo, FillsWhatTheTableHas) {
    // Expected are id, utcsec, prio and isdir, then the texts in order.
    const std::tuple<const char *, bool, std::string, const char *> cases[] = {
        {"logs", false, kEveryColumn,
         "7|-5|3|0|86|h|10.0.0.1|auth|+08:00|2020/01/02|10:11:12|sshd|root: hi: there||||||"},
        {"logs", true, kEveryColumn,
         "7|-5|3|0|86|h|10.0.0.1|auth|+08:00|2020/01/02|10:11:12|sshd| hi: there||||||"},
        {"connection_log", false, kEveryColumn,
         "7|0|2|0||h||||2020/01/02|10:11:12|sshd||luser|root: hi: there||||"},
        {"transfer_log", true, kEveryColumn,
         "7|0|0|1||h||||2020/01/02|10:11:12|sshd||luser|write|10.0.0.1|file|12 KB|"},
        // Numbers are read from their leading digits, and NULL as nothing.
        {"logs", false, "NULL msg, '12abc' id, '7.9' utcsec", "12|7|7|0|||||||||||||||"},
        {"logs", false, "NULL id, '-9223372036854775808' utcsec",
         "0|-9223372036854775808|7|0|||||||||||||||"},
        {"logs", false, "'18446744073709551615' id, 4294967296 utcsec", "-1|4294967296|7|0|||||||||||||||"},
        // The record is one for all rows.
        {"logs", false, "'ab' host, 'x' msg UNION ALL SELECT 'cd', 'yz' UNION ALL SELECT NULL, 'uv'",
         "0|0|7|0||ab|||||||x||||||0|0|7|0||cd|||||||yz||||||0|0|7|0|||||||||uv||||||"},
        {"LOGS", false, kEveryColumn, ""}, // the case counts
    };
    for (const auto &[table, trimUser, columns, expected] : cases) {
        const TempRoot root;
        const std::string path = root.File("rows.db");
        RunSql(path, std::string("CREATE TABLE ") + table + " AS SELECT " + columns);
        std::string text;
        EXPECT_EQ(SyslogDBSelectByTable(path, table, {{SYSLOG_ATTRI_MSG, SYSLOG_OP_RAW, "1", {}}}, nullptr,
                                        nullptr, TakeText, &text, trimUser),
                  0);
        EXPECT_EQ(text, expected) << table << " " << columns;
    }
}

} // namespace
