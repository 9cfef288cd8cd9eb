#include <gtest/gtest.h>

#include "keloplatform/kelodb.h"
#include "kelosyslog/records.h"
#include "support/log_database.h"
#include "support/temp_root.h"

namespace {

using kelo::test::RunSql;
using kelo::test::TempRoot;

// The first row of a query on a real database.
class QueriedRow {
public:
    explicit QueriedRow(const std::string &sql) {
        RunSql(root_.File("rows.db"), "CREATE TABLE t (a)");
        DBConnect_tag *connection = KELODBConnect(nullptr, nullptr, nullptr, root_.File("rows.db").c_str());
        EXPECT_EQ(KELODBExecute(connection, sql.c_str(), &result), 0);
        KELODBClose(connection);
        EXPECT_EQ(KELODBFetchRow(result, &row), 0);
    }
    ~QueriedRow() { KELODBFreeResult(result); }

    int ConvertTo(_SYSLOG_LOG_DATA_tag &log, const std::string &table, bool trimUser = false) const {
        return DBRecToLogInfo(table, result, row, &log, trimUser);
    }

    DBResult_tag *result = nullptr;
    unsigned int row = 0;

private:
    TempRoot root_;
};

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

TEST(DBRecToLogInfo, FillsWhatTheTableHasAndKeepsTheRest) {
    const QueriedRow row(kEveryColumn);
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
    for (const auto &c : cases) {
        _SYSLOG_LOG_DATA_tag log = FilledLog();
        EXPECT_EQ(row.ConvertTo(log, c.table, c.trimUser), 0);
        EXPECT_EQ(TextOf(log), c.expected) << c.table;
    }
}

TEST(DBRecToLogInfo, ReadsNumbersFromTheLeadingDigitsAndNullAsNothing) {
    const struct {
        const char *columns;
        const char *numbers;
    } cases[] = {
        {"'12abc' id, '7.9' utcsec", "12|7"},
        {"NULL id, 'x1' utcsec", "0|0"},
        {"'9223372036854775807' id, '-9223372036854775808' utcsec",
         "9223372036854775807|-9223372036854775808"},
        {"'18446744073709551615' id, 4294967296 utcsec", "-1|4294967296"}, // shown as signed
    };
    for (const auto &c : cases) {
        const QueriedRow row(std::string("SELECT NULL msg, ") + c.columns);
        _SYSLOG_LOG_DATA_tag log = FilledLog();
        EXPECT_EQ(row.ConvertTo(log, "logs"), 0);
        EXPECT_EQ(TextOf(log), c.numbers + std::string("|92|7|93||||||||||u|e|x|n|s|"));
    }
}

TEST(DBRecToLogInfo, LeavesTheRecordAloneWhenItFails) {
    const QueriedRow row(kEveryColumn);
    _SYSLOG_LOG_DATA_tag log = FilledLog();
    for (const char *table : {"LOGS", "logs ", ""})
        EXPECT_EQ(row.ConvertTo(log, table), -1) << table;
    for (const char *table : {"logs", "general_log", "connection_log", "transfer_log"}) {
        EXPECT_EQ(DBRecToLogInfo(table, nullptr, 0, &log, true), -1) << table;
        EXPECT_EQ(DBRecToLogInfo(table, row.result, 0, nullptr, true), -1) << table;
    }
    EXPECT_EQ(TextOf(log), TextOf(FilledLog()));
}

} // namespace
