#include <gtest/gtest.h>

#include "keloplatform/kelodb.h"
#include "kelosyslog/records.h"
#include "support/log_database.h"
#include "support/temp_root.h"

namespace {

using namespace kelo::test;

const std::string kEveryColumn =
    "SELECT '7' id, 'h' host, '10.0.0.1' ip, '86' tag, '+08:00' tzoffset, '2020/01/02' ldate, '10:11:12' "
    "ltime, "
    "'sshd' prog, 'root: hi: there' msg, '-5' utcsec, 'auth' fac, 'err' prio, 'crit' llevel, 'luser' luser, "
    "'write' event, 'file' fname, '1' isdir, '12 KB' fsize";

// A record whose fields all differ from what a row holds, as text for comparison.
_SYSLOG_LOG_DATA_tag FilledLog() {
    return {90,  91, 92, SYSLOG_PRIO_ALERT, "t", "o", "i", "f", "z", "d", "l", "p", "m", "u", "e", "x",
            "n", 93, "s"};
}

std::string TextOf(const _SYSLOG_LOG_DATA_tag &log) {
    std::string text;
    for (const int64_t number : {static_cast<int64_t>(log.id), log.utcsec, log.extnum,
                                 static_cast<int64_t>(log.prio), static_cast<int64_t>(log.isdir)})
        text += std::to_string(number) + "|";
    for (const std::string *field :
         {&log.tag, &log.host, &log.ip, &log.fac, &log.tzoffset, &log.ldate, &log.ltime, &log.prog, &log.msg,
          &log.luser, &log.event, &log.xferip, &log.fname, &log.fsize})
        text += *field + "|";
    return text;
}

// The filled record's text after a conversion of the row that a query gives on a real database.
std::string Converted(const std::string &sql, const std::string &table, bool trimUser = false,
                      int expectedResult = 0) {
    const TempRoot root;
    RunSql(root.File("rows.db"), "CREATE TABLE t (a)");
    DBConnect_tag *connection = KELODBConnect(nullptr, nullptr, nullptr, root.File("rows.db").c_str());
    DBResult_tag *result = nullptr;
    EXPECT_EQ(KELODBExecute(connection, sql.c_str(), &result), 0);
    KELODBClose(connection);
    unsigned int row = 0;
    EXPECT_EQ(KELODBFetchRow(result, &row), 0);
    _SYSLOG_LOG_DATA_tag log = FilledLog();
    EXPECT_EQ(DBRecToLogInfo(table, result, row, &log, trimUser), expectedResult) << table;
    EXPECT_EQ(DBRecToLogInfo(table, result, row, nullptr, trimUser), -1);
    EXPECT_EQ(DBRecToLogInfo(table, nullptr, row, &log, trimUser), -1);
    KELODBFreeResult(result);
    return TextOf(log);
}

TEST(DBRecToLogInfo, FillsWhatTheTableHasAndKeepsTheRest) {
    const struct {
        const char *table;
        bool trimUser;
        const char *expected; // id, utcsec, extnum, prio, isdir, then the texts in order
    } cases[] = {
        {"logs", false,
         "7|-5|92|3|93|86|h|10.0.0.1|auth|+08:00|2020/01/02|10:11:12|sshd|root: hi: there|u|e|x|n|s|"},
        {"logs", true,
         "7|-5|92|3|93|86|h|10.0.0.1|auth|+08:00|2020/01/02|10:11:12|sshd| hi: there|u|e|x|n|s|"},
        {"connection_log", false,
         "7|91|92|2|93|t|h|i|f|z|2020/01/02|10:11:12|sshd|m|luser|root: hi: there|x|n|s|"},
        {"transfer_log", true,
         "7|91|92|1|1|t|h|i|f|z|2020/01/02|10:11:12|sshd|m|luser|write|10.0.0.1|file|12 KB|"},
    };
    for (const auto &c : cases)
        EXPECT_EQ(Converted(kEveryColumn, c.table, c.trimUser), c.expected) << c.table;
}

TEST(DBRecToLogInfo, ReadsNumbersFromTheLeadingDigitsAndNullAsNothing) {
    const std::pair<const char *, const char *> cases[] = {
        {"'12abc' id, '7.9' utcsec", "12|7"},
        {"NULL id, '-9223372036854775808' utcsec", "0|-9223372036854775808"},
        {"'18446744073709551615' id, 4294967296 utcsec", "-1|4294967296"}, // shown as signed
    };
    for (const auto &[columns, numbers] : cases)
        EXPECT_EQ(Converted(std::string("SELECT NULL msg, ") + columns, "logs"),
                  numbers + std::string("|92|7|93||||||||||u|e|x|n|s|"));
}

TEST(DBRecToLogInfo, LeavesTheRecordAloneWhenItKnowsNoSuchTable) {
    for (const char *table : {"LOGS", "logs ", ""})
        EXPECT_EQ(Converted(kEveryColumn, table, false, -1), TextOf(FilledLog())) << table;
}

} // namespace
