#include <utility>

#include "kelosyslog/dbreader.h"
#include "query/condition_text.h"
#include "query/search.h"
#include "query/statement.h"

using namespace kelo;

SyslogDBReader::SyslogDBReader(std::string dbPath) : dbPath_(std::move(dbPath)) {}

SyslogDBReader::~SyslogDBReader() {
    KELODBClose(connection_);
}

bool SyslogDBReader::Connect() {
    if (connection_ != nullptr && !isInSnapshot_ && HasMoved(connection_))
        KELODBClose(std::exchange(connection_, nullptr));
    if (connection_ == nullptr)
        connection_ = ConnectOrFail(dbPath_).release();
    return connection_ != nullptr;
}

int SyslogDBReader::SelectByTable(const std::string &table, const std::list<_SYSLOG_SQL_COND_tag> &conditions,
                                  const _SYSLOG_SQL_LIMIT_tag *limit, const _SYSLOG_SQL_ORDER_tag *order,
                                  SyslogDBRowCallback callback, void *context, bool trimUser) {
    if (!CheckDbPath(dbPath_, 472))
        return -1;
    Statement statement;
    if (!WriteSelect({table, conditions, limit, order}, statement))
        return -1;
    if (!Connect()) {
        ReportFailedConnection(dbPath_);
        return -1;
    }
    return RunSelect(connection_, dbPath_, table, statement, {callback, context, trimUser});
}

int SyslogDBReader::Select(const std::list<_SYSLOG_SQL_COND_tag> &conditions,
                           const _SYSLOG_SQL_LIMIT_tag *limit, const _SYSLOG_SQL_ORDER_tag *order,
                           SyslogDBRowCallback callback, void *context, bool trimUser) {
    return SelectByTable("logs", conditions, limit, order, callback, context, trimUser);
}

int SyslogDBReader::SelectCountByTable(const std::string &table,
                                       const std::list<_SYSLOG_SQL_COND_tag> &conditions,
                                       const _SYSLOG_SQL_LIMIT_tag *limit,
                                       const _SYSLOG_SQL_ORDER_tag *order) {
    if (!CheckDbPath(dbPath_, 581))
        return -1;
    CountStatement statement;
    if (!WriteCount({table, conditions, limit, order}, statement) || !Connect())
        return -1;
    return RunCount(connection_, dbPath_, statement);
}

int SyslogDBReader::SelectCount(const std::list<_SYSLOG_SQL_COND_tag> &conditions,
                                const _SYSLOG_SQL_LIMIT_tag *limit, const _SYSLOG_SQL_ORDER_tag *order) {
    return SelectCountByTable("logs", conditions, limit, order);
}

int SyslogDBReader::Run(const char *sql) {
    return KELODBExecute(connection_, sql, nullptr) >= 0 ? 0 : FailStatement(connection_, dbPath_, sql);
}

int SyslogDBReader::SnapshotBegin() {
    if (isInSnapshot_)
        return Fail(KELO_FAILURE_ARGUMENT, dbPath_, "BEGIN", "a snapshot is there already");
    if (!Connect() || Run("BEGIN") != 0)
        return -1;
    isInSnapshot_ = true;
    return 0;
}

int SyslogDBReader::SnapshotEnd() {
    if (!std::exchange(isInSnapshot_, false))
        return Fail(KELO_FAILURE_ARGUMENT, dbPath_, "ROLLBACK", "there is no snapshot");
    if (Run("ROLLBACK") == 0)
        return 0;
    KELODBClose(std::exchange(connection_, nullptr)); // which ends it in any case
    return -1;
}

int LogSearchClauseGet(const std::list<_SYSLOG_SQL_COND_tag> &conditions, std::string &clause) {
    std::string body;
    if (SyslogSQLCondListStrGen(conditions, body, LostValue::IsFailure) != 0)
        return -1;
    clause += body;
    return 0;
}
