#include "support/log_database.h"

#include <stdexcept>

#include "support/fault_pause.h"
#include "support/source_dir.h"
#include "support/temp_root.h"

namespace kelo::test {
namespace {

using Database = std::unique_ptr<sqlite3, int (*)(sqlite3 *)>;
using Statement = std::unique_ptr<sqlite3_stmt, decltype(&sqlite3_finalize)>;

[[noreturn]] void Fail(sqlite3 *db, const std::string &what) {
    throw std::runtime_error(what + ": " + sqlite3_errmsg(db));
}

Database Open(const std::string &path) {
    sqlite3 *db = nullptr;
    const int status = sqlite3_open(path.c_str(), &db);
    Database owner(db, sqlite3_close);
    if (status != SQLITE_OK)
        Fail(db, path);
    const FaultPause pause; // a wait of the test's own
    sqlite3_busy_timeout(db, 10000);
    return owner;
}

void Run(sqlite3 *db, const std::string &sql) {
    if (sqlite3_exec(db, sql.c_str(), nullptr, nullptr, nullptr) != SQLITE_OK)
        Fail(db, sql);
}

Statement Prepare(sqlite3 *db, const std::string &sql) {
    sqlite3_stmt *statement = nullptr;
    if (sqlite3_prepare_v2(db, sql.c_str(), -1, &statement, nullptr) != SQLITE_OK)
        Fail(db, sql);
    return Statement(statement, sqlite3_finalize);
}

} // namespace

void RunSql(const std::string &path, const std::string &sql) {
    Run(Open(path).get(), sql);
}

std::string QueryText(const std::string &path, const std::string &sql) {
    const Database db = Open(path);
    const Statement statement = Prepare(db.get(), sql);
    if (sqlite3_step(statement.get()) != SQLITE_ROW)
        return "";
    const auto *text = reinterpret_cast<const char *>(sqlite3_column_text(statement.get(), 0));
    return text != nullptr ? text : "";
}

void CreateLogDatabase(const std::string &path, const std::string &schema) {
    const std::string sql = ReadFile(BuildPath("package/schema/") + schema);
    if (sql.empty())
        throw std::runtime_error("no schema " + schema);
    RunSql(path, "PRAGMA journal_mode=WAL;" + sql);
}

void InsertLogs(const std::string &path, const std::vector<_SYSLOG_LOG_DATA_tag> &logs) {
    const Database db = Open(path);
    Run(db.get(), "BEGIN IMMEDIATE");
    const Statement statement = Prepare(
        db.get(), "INSERT INTO logs(host,ip,fac,prio,llevel,tag,tzoffset,ldate,ltime,prog,msg,utcsec,id) "
                  "VALUES(?1,?2,?3,?4,?4,?5,?6,?7,?8,?9,?10,?11,nullif(?12,0))");
    for (const _SYSLOG_LOG_DATA_tag &log : logs) {
        int index = 0;
        for (const std::string &text : {log.host, log.ip, log.fac, PriorTypeToStr(log.prio), log.tag,
                                        log.tzoffset, log.ldate, log.ltime, log.prog, log.msg})
            sqlite3_bind_text(statement.get(), ++index, text.data(), static_cast<int>(text.size()),
                              SQLITE_TRANSIENT);
        sqlite3_bind_int64(statement.get(), ++index, log.utcsec);
        sqlite3_bind_int64(statement.get(), ++index, static_cast<sqlite3_int64>(log.id));
        if (sqlite3_step(statement.get()) != SQLITE_DONE)
            Fail(db.get(), "insert");
        sqlite3_reset(statement.get());
    }
    Run(db.get(), "COMMIT");
}

void InsertLogsIntoWal(const std::string &path, const std::vector<_SYSLOG_LOG_DATA_tag> &logs) {
    // The last connection that closes empties the log, unless this is switched off.
    const Database last = Open(path);
    Run(last.get(), "SELECT count(*) FROM sqlite_schema");
    InsertLogs(path, logs);
    sqlite3_db_config(last.get(), SQLITE_DBCONFIG_NO_CKPT_ON_CLOSE, 1, nullptr);
}

_SYSLOG_LOG_DATA_tag SampleLog(int number) {
    static const char *const kFacilities[] = {"kern", "user", "daemon", "auth", "local0", "local7"};
    const auto twoDigits = [](int value) { return (value < 10 ? "0" : "") + std::to_string(value); };
    _SYSLOG_LOG_DATA_tag log;
    log.utcsec = 1577836800 + number;
    log.prio = static_cast<_SYSLOG_DB_PRIORITY_tag>(number % 8);
    log.tag = "86";
    log.host = "host" + twoDigits(number % 50);
    log.ip = "10.0.0." + std::to_string(number % 50);
    log.fac = kFacilities[number % 6];
    log.tzoffset = "+00:00";
    log.ldate = "2020/01/01";
    log.ltime = twoDigits(number / 3600) + ":" + twoDigits(number / 60 % 60) + ":" + twoDigits(number % 60);
    log.prog = "prog" + twoDigits(number % 30);
    log.msg = "user" + std::to_string(number % 97) + ": request " + std::to_string(number) +
              " from 192.168.1." + std::to_string(number % 254) + " took " + std::to_string(number % 1000) +
              " ms, status " + (number % 13 == 0 ? "FAILED" : "done") + ", session closed normally";
    return log;
}

void InsertSampleLogs(const std::string &path, int count) {
    std::vector<_SYSLOG_LOG_DATA_tag> logs;
    for (int number = 0; number < count; ++number)
        logs.push_back(SampleLog(number));
    InsertLogs(path, logs);
}

DatabaseLock::DatabaseLock(const std::string &path, const std::string &sql) : db_(Open(path)) {
    Run(sql);
}

void DatabaseLock::Run(const std::string &sql) {
    test::Run(db_.get(), sql);
}

std::string DamagePages(const std::string &path) {
    std::string content = ReadFile(path);
    for (size_t page = 8192; page + 4096 < content.size(); page += 4096)
        content.replace(page, 8, 8, '\xff');
    WriteFile(path, content);
    return content;
}

} // namespace kelo::test
