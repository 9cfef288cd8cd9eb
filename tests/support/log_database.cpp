#include "support/log_database.h"

#include <filesystem>
#include <optional>
#include <stdexcept>

#include "support/doubles.h"
#include "support/source_dir.h"
#include "support/temp_root.h"

namespace kelo::test {
TestDatabase::TestDatabase(const std::string &path) : db_(nullptr, sqlite3_close) {
    std::filesystem::create_directories(std::filesystem::path(path).parent_path());
    sqlite3 *db = nullptr;
    const int status = sqlite3_open(path.c_str(), &db);
    db_.reset(db);
    if (status != SQLITE_OK)
        throw std::runtime_error(path + ": " + sqlite3_errmsg(db));
    const FaultPause pause; // a wait of the test's own
    sqlite3_busy_timeout(db, 10000);
}

std::string TestDatabase::Run(const std::string &sql) {
    std::optional<std::string> first;
    const auto take = [](void *to, int, char **values, char **) {
        auto &text = *static_cast<std::optional<std::string> *>(to);
        text = text.value_or(values[0] != nullptr ? values[0] : "");
        return 0;
    };
    if (sqlite3_exec(db_.get(), sql.c_str(), take, &first, nullptr) != SQLITE_OK)
        throw std::runtime_error(sql + ": " + sqlite3_errmsg(db_.get()));
    return first.value_or("");
}

void CreateLogDatabase(const std::string &path, const std::string &schema) {
    const std::string sql = ReadFile(BuildPath("package/schema/") + schema);
    if (sql.empty())
        throw std::runtime_error("no schema " + schema);
    RunSql(path, "PRAGMA journal_mode=WAL;" + sql);
}

void InsertLogs(const std::string &path, const std::vector<_SYSLOG_LOG_DATA_tag> &logs) {
    TestDatabase db(path);
    db.Run("BEGIN IMMEDIATE");
    for (const _SYSLOG_LOG_DATA_tag &log : logs) {
        const std::string severity = PriorTypeToStr(log.prio);
        const std::unique_ptr<char, decltype(&sqlite3_free)> sql(
            sqlite3_mprintf(
                "INSERT INTO logs(host,ip,fac,prio,llevel,tag,tzoffset,ldate,ltime,prog,msg,utcsec,id) "
                "VALUES(%Q,%Q,%Q,%Q,%Q,%Q,%Q,%Q,%Q,%Q,%Q,%lld,nullif(%llu,0))",
                log.host.c_str(), log.ip.c_str(), log.fac.c_str(), severity.c_str(), severity.c_str(),
                log.tag.c_str(), log.tzoffset.c_str(), log.ldate.c_str(), log.ltime.c_str(), log.prog.c_str(),
                log.msg.c_str(), static_cast<long long>(log.utcsec), static_cast<unsigned long long>(log.id)),
            sqlite3_free);
        db.Run(sql.get());
    }
    db.Run("COMMIT");
}

void InsertLogsIntoWal(const std::string &path, const std::vector<_SYSLOG_LOG_DATA_tag> &logs) {
    // The last connection that closes empties the log, unless it is told not to.
    TestDatabase last(path);
    last.Run("SELECT count(*) FROM sqlite_schema");
    InsertLogs(path, logs);
    sqlite3_db_config(last.Get(), SQLITE_DBCONFIG_NO_CKPT_ON_CLOSE, 1, nullptr);
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

std::string DamagePages(const std::string &path) {
    std::string content = ReadFile(path);
    for (size_t page = 8192; page + 4096 < content.size(); page += 4096)
        content.replace(page, 8, 8, '\xff');
    WriteFile(path, content);
    return content;
}

} // namespace kelo::test
