#pragma once

#include <list>
#include <string>

#include "kelosyslog/dbutil.h"

struct DBConnect_tag;

namespace kelo {

// What is searched or counted.
struct Question {
    const std::string &table;
    const std::list<_SYSLOG_SQL_COND_tag> &conditions;
    const _SYSLOG_SQL_LIMIT_tag *limit;
    const _SYSLOG_SQL_ORDER_tag *order;
};

// A statement, with the page for the platform's limited select (null for none).
struct Statement {
    std::string sql;
    const _SYSLOG_SQL_LIMIT_tag *page = nullptr;
};

// The receiver of rows.
struct RowReceiver {
    SyslogDBRowCallback callback;
    void *context;
    bool trimUser;
};

// Writes the statement of a search. False, after a report, when a condition cannot be rendered.
bool WriteSelect(const Question &question, Statement &statement);
// Reports that the database of a search cannot be opened.
void ReportFailedConnection(const std::string &dbPath);
// Runs it. `dbPath` is for the reason of a failure. Returns as SyslogDBSelectByTable does.
int RunSelect(DBConnect_tag *connection, const std::string &dbPath, const std::string &table,
              const Statement &statement, const RowReceiver &receiver);

// The same for a count, whose number has the name `expression`.
struct CountStatement : Statement {
    const char *expression = "";
};
bool WriteCount(const Question &question, CountStatement &statement);
int RunCount(DBConnect_tag *connection, const std::string &dbPath, const CountStatement &statement);

} // namespace kelo
