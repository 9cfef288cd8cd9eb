// Every function of the library that fails says why.

#include <fstream>

#include "faults/operations.h"
#include "kelosyslog/accounting.h"
#include "kelosyslog/cmdparser.h"
#include "kelosyslog/dbhandler.h"
#include "kelosyslog/dbreader.h"
#include "kelosyslog/dbwriter.h"
#include "kelosyslog/failure.h"
#include "kelosyslog/logger.h"
#include "kelosyslog/logparser.h"
#include "kelosyslog/notification.h"
#include "kelosyslog/root.h"
#include "kelosyslog/utils.h"
#include "support/test.h"

namespace kelo::test {
namespace {

std::string none; // in a folder that is a file
const std::string kNul("/a\0b", 4);
std::string text = "{";
std::list<std::string> values;
std::map<uint64_t, std::string> names;
_ARCH_DB_INFO_tag info;
_SYSLOG_LOG_DATA_tag log;
_SYSLOG_NOTIFY_RULES_tag rule;
char small[1];
const _SYSLOG_LOG_DATA_tag kLogs[1];

// A call that fails, by the name of its function. A handler that is not connected fails at everything.
const std::multimap<std::string, std::function<void()>> kCalls = {
    {"AccountingManager::AccoutingFlush2DB",
     [] {
         AccountingManager accounting(none);
         accounting.LogInc("a");
         now += 2;
         accounting.CurEpsUpdate();
         accounting.AccoutingFlush2DB();
     }},
    {"CmdParser::CmdParse",
     [] {
         std::vector<Json::Value> commands;
         CmdParser().CmdParse(text, commands);
     }},
    {"DBErrorHandle_SQLITE_CORRUPT", [] { DBErrorHandle_SQLITE_CORRUPT(nullptr, none); }},
    {"DBHandler::DBCmdEscape", [] { DBHandler().DBCmdEscape(kNul); }},
    {"DBHandler::DBCon", [] { DBHandler("$", "").DBCon(); }},
    {"DBHandler::DBCreate", [] { DBHandler("$", "").DBCreate(); }},
    {"DBHandler::DBExecute", [] { DBHandler().DBExecute("SELECT 1"); }},
    {"DBHandler::DBExecute", [] { DBHandler().DBExecute("SELECT 1", nullptr, nullptr); }},
    {"DBHandler::DBInfoCntGet", [] { DBHandler().DBInfoCntGet(); }},
    {"DBHandler::DBInfoDevSet", [] { DBHandler().DBInfoDevSet("a"); }},
    {"DBHandler::DBInfoEndGet", [] { DBHandler().DBInfoEndGet(); }},
    {"DBHandler::DBInfoEndSet", [] { DBHandler().DBInfoEndSet(1); }},
    {"DBHandler::DBInfoEndStrGet", [] { DBHandler().DBInfoEndStrGet(); }},
    {"DBHandler::DBInfoGet", [] { DBHandler().DBInfoGet(info); }},
    {"DBHandler::DBInfoStartGet", [] { DBHandler().DBInfoStartGet(); }},
    {"DBHandler::DBInfoStartSet", [] { DBHandler().DBInfoStartSet(1); }},
    {"DBHandler::DBInfoStartStrGet", [] { DBHandler().DBInfoStartStrGet(); }},
    {"DBHandler::DBLogCountGet", [] { DBHandler().DBLogCountGet(); }},
    {"DBHandler::DBLogEndTimeGet", [] { DBHandler().DBLogEndTimeGet(); }},
    {"DBHandler::DBLogStartTimeGet", [] { DBHandler().DBLogStartTimeGet(); }},
    {"DBHandler::DBTranEnd", [] { DBHandler().DBTranEnd(); }},
    {"DBHandler::DBTranRollback", [] { DBHandler().DBTranRollback(); }},
    {"DBHandler::DBTranStart", [] { DBHandler().DBTranStart(); }},
    {"DBHandler::DBWalCheckpoint", [] { DBHandler().DBWalCheckpoint(false); }},
    {"DBHandler::DBcheckTableExist", [] { DBHandler().DBcheckTableExist("logs"); }},
    {"DBRecToAllLogInfo", [] { DBRecToAllLogInfo(nullptr, 0, &log, false); }},
    {"DBRecToLogInfo", [] { DBRecToLogInfo("colours", nullptr, 0, &log, false); }},
    {"DBRecToSysLogInfo", [] { DBRecToSysLogInfo(nullptr, 0, &log); }},
    {"DBRecToXferLogInfo", [] { DBRecToXferLogInfo(nullptr, 0, &log); }},
    {"EncodeJson", [] { EncodeJson("text", small, 1); }},
    {"IsNotificationSet", [] { IsNotificationSet(); }},
    {"LogParser::ParseSingleEntry", [] { LogParser().ParseSingleEntry("short", log); }},
    {"LogSearchClauseGet",
     [] {
         LogSearchClauseGet({{SYSLOG_ATTRI_HOST, SYSLOG_OP_EQ, kNul, {}}}, text);
     }},
    {"LogSearchCondListGen",
     [] {
         std::list<_SYSLOG_SQL_COND_tag> conditions;
         LogSearchCondListGen("", "", "", "", "/(/", "", "", conditions);
     }},
    {"Logger::LogAdd", [] { Logger().LogAdd("$", 0, "a", "b"); }},
    {"Logger::LogCount", [] { Logger().LogCount("none"); }},
    {"Logger::LogEnum", [] { Logger().LogEnum("$", 0, 1); }},
    {"Logger::LogHtmlGen", [] { Logger().LogHtmlGen("", "", ""); }},
    {"Logger::LogHtmlRemove", [] { Logger().LogHtmlRemove(none); }},
    {"Logger::LogRotation", [] { Logger().LogRotation("none"); }},
    {"NotificationManager::ConfigLoad", [] { NotificationManager().ConfigLoad(none); }},
    {"NotificationManager::NotificationSend", [] { NotificationManager().NotificationSend("A", nullptr); }},
    {"NotificationManager::NotificationSendEps", [] { NotificationManager().NotificationSendEps(1); }},
    {"NotificationManager::NotificationSendKeyword",
     [] { NotificationManager().NotificationSendKeyword("a", "b", "c"); }},
    {"NotificationManager::NotificationSendSev",
     [] { NotificationManager().NotificationSendSev("a", "err", std::string(3000, 'x')); }},
    {"NotificationManager::NotificationSendVolFull",
     [] { NotificationManager().NotificationSendVolFull("a"); }},
    {"SyslogDBAttriValueGet", [] { SyslogDBAttriValueGet(none, "host", nullptr, values); }},
    {"SyslogDBDelete", [] { SyslogDBDelete(none, {}); }},
    {"SyslogDBEpsGet", [] { SyslogDBEpsGet(none, 0, 1); }},
    {"SyslogDBExtkeyLookupByName", [] { SyslogDBExtkeyLookupByName(none, SYSLOG_EXTKEY_TAG, "a"); }},
    {"SyslogDBExtkeyMapGet", [] { SyslogDBExtkeyMapGet(none, SYSLOG_EXTKEY_TAG, names); }},
    {"SyslogDBHistGet", [] { SyslogDBHistGet(none, 1); }},
    {"SyslogDBHistGetSingle", [] { SyslogDBHistGetSingle(none, "a"); }},
    {"SyslogDBHistTotalGet", [] { SyslogDBHistTotalGet(none); }},
    {"SyslogDBReader::Select",
     [] { SyslogDBReader(none).Select({}, nullptr, nullptr, nullptr, nullptr, false); }},
    {"SyslogDBReader::SelectByTable",
     [] { SyslogDBReader("a").SelectByTable("logs", {}, nullptr, nullptr, nullptr, nullptr, false); }},
    {"SyslogDBReader::SelectCount", [] { SyslogDBReader(none).SelectCount({}, nullptr, nullptr); }},
    {"SyslogDBReader::SelectCountByTable",
     [] { SyslogDBReader(none).SelectCountByTable("logs", {}, nullptr, nullptr); }},
    {"SyslogDBReader::SnapshotBegin", [] { SyslogDBReader(none).SnapshotBegin(); }},
    {"SyslogDBReader::SnapshotEnd", [] { SyslogDBReader(none).SnapshotEnd(); }},
    {"SyslogDBSelect", [] { SyslogDBSelect(none, {}, nullptr, nullptr, nullptr, nullptr, false); }},
    {"SyslogDBSelectByTable",
     [] { SyslogDBSelectByTable("a", "logs", {}, nullptr, nullptr, nullptr, nullptr, false); }},
    {"SyslogDBSelectCount", [] { SyslogDBSelectCount(none, {}, nullptr, nullptr); }},
    {"SyslogDBSelectCountByTable", [] { SyslogDBSelectCountByTable("a", "logs", {}, nullptr, nullptr); }},
    {"SyslogDBVersionGet", [] { SyslogDBVersionGet(none); }},
    {"SyslogDBWriter::Open", [] { SyslogDBWriter(none).Open(); }},
    {"SyslogDBWriter::Store", [] { SyslogDBWriter(none).Store(kLogs, 1); }},
    {"SyslogMailKeywordMatched", [] { SyslogMailKeywordMatched(nullptr, "a"); }},
    {"SyslogMailSend", [] { SyslogMailSend("A", nullptr); }},
    {"SyslogMailSeverityExceeded", [] { SyslogMailSeverityExceeded("err", nullptr); }},
    {"SyslogMailShareEncMount", [] { SyslogMailShareEncMount(nullptr); }},
    {"SyslogMailShareEncUnmount", [] { SyslogMailShareEncUnmount("a"); }},
    {"SyslogMailShareRemove", [] { SyslogMailShareRemove("a"); }},
    {"SyslogMailShareRename", [] { SyslogMailShareRename(nullptr); }},
    {"SyslogNotifyConfGet", [] { SyslogNotifyConfGet(none, "a", rule); }},
    {"SyslogNotifyConfSet", [] { SyslogNotifyConfSet(none, "a", rule); }},
    {"SyslogRootSet", [] { SyslogRootSet("relative"); }},
    {"SyslogngHupSignalSend", [] { SyslogngHupSignalSend(); }},
    {"SyslogngWorkingDbCheck", [] { SyslogngWorkingDbCheck(none, 1); }},
    {"SyslogngWorkingDbSetJouWal", [] { SyslogngWorkingDbSetJouWal(none); }},
    {"readfileinreverse",
     [] {
         char **lines = nullptr;
         int count = 0;
         FILE *pipe = popen("true", "r");
         readfileinreverse(pipe, &lines, count, 1);
         pclose(pipe);
         std::free(lines);
     }},
    {"szLevelGet", [] { szLevelGet(0, nullptr, 1); }},
};

// What never fails, or only as another function that it calls.
const std::set<std::string> kOthers = {"AccountingManager::AccountingDump",
                                       "AccountingManager::AccountingManager",
                                       "AccountingManager::ConfigLoad",
                                       "AccountingManager::CurEpsUpdate",
                                       "AccountingManager::CurrentEpsGet",
                                       "AccountingManager::EpsHandlerSet",
                                       "AccountingManager::FlushStatementsSet",
                                       "AccountingManager::HistogramGet",
                                       "AccountingManager::LogInc",
                                       "AccountingManager::SamplesDrop",
                                       "AccountingManager::TotalCountGet",
                                       "AccountingManager::isNeed2Flush",
                                       "CmdParser::CmdParser",
                                       "DBHandler::DBDiscon",
                                       "DBHandler::DBErrorHandle",
                                       "DBHandler::DBHandler",
                                       "DBHandler::isConnected",
                                       "DBHandler::isInTran",
                                       "Debuger::MSG",
                                       "Debuger::ThresholdGet",
                                       "Debuger::ThresholdSet",
                                       "LogAttriStrGet",
                                       "LogAttriType",
                                       "LogParser::LogAdd",
                                       "LogParser::LogDump",
                                       "LogParser::LogGetCount",
                                       "LogParser::LogListGet",
                                       "LogParser::LogListTake",
                                       "LogParser::LogParser",
                                       "LogParser::LogReset",
                                       "LogParser::PartialLogDump",
                                       "LogParser::PartialLogSet",
                                       "LogParser::RejectedClear",
                                       "LogParser::Tokenize",
                                       "LogParser::isValidLog",
                                       "LogStream::Add",
                                       "LogStream::Finish",
                                       "LogStream::LogStream",
                                       "LogStream::OverlongCount",
                                       "LogStream::TakenBytes",
                                       "Logger::LogAddArchFailed",
                                       "Logger::LogAddArchFinish",
                                       "Logger::LogAddArchStart",
                                       "Logger::LogAddLogClear",
                                       "Logger::LogAddNotifyEps",
                                       "Logger::LogAddNotifyKw",
                                       "Logger::LogAddNotifySev",
                                       "Logger::LogAddServStart",
                                       "Logger::LogAddServStop",
                                       "Logger::LogAddVolFull",
                                       "Logger::LogClear",
                                       "NotificationManager::CheckEps",
                                       "NotificationManager::CheckKeyword",
                                       "NotificationManager::CheckSev",
                                       "NotificationManager::NotificationManager",
                                       "PriorStrToType",
                                       "PriorTypeToStr",
                                       "SyslogDBReader::SyslogDBReader",
                                       "SyslogDBWriter::Close",
                                       "SyslogDBWriter::ConnectionGet",
                                       "SyslogDBWriter::HasMoved",
                                       "SyslogDBWriter::SyslogDBWriter",
                                       "Tokenize",
                                       "TrimUserName",
                                       "XferlogDBPathGet",
                                       "strLevelGet",
                                       "ullNumberToString"};

class Reasons : public LibraryTest {};

TEST_F(Reasons, AreSetByEveryFunctionThatFails) {
    WriteFile(root_.File("file"), "");
    none = root_.File("file/none.db");
    PlatformCalls::answers.notification = -1;
    PlatformCalls::answers.reload = false;
    for (const auto &[name, call] : kCalls) {
        SyslogFailureClear();
        call();
        EXPECT_NE(SyslogFailureGet()->kind, KELO_FAILURE_NONE) << name;
    }
}

// A function that comes has a row above.
TEST_F(Reasons, AreKnownForEverySymbol) {
    std::ifstream file(SourcePath("package/debian/libkelosyslog0.symbols"));
    bool isOurs = false;
    int count = 0;
    for (std::string line; std::getline(file, line);) {
        isOurs = isOurs || line.starts_with("libkelosyslog.so");
        const size_t begin = line.find("(c++)\""), end = line.find_first_of("([@", begin + 6);
        if (!isOurs || begin == std::string::npos || end == std::string::npos)
            continue;
        const std::string name = line.substr(begin + 6, end - begin - 6);
        ++count;
        EXPECT_TRUE(name.find('~') != std::string::npos || kCalls.contains(name) || kOthers.contains(name))
            << name;
    }
    EXPECT_GT(count, 100);
}

} // namespace
} // namespace kelo::test
