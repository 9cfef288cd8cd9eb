#include "common/failure.h"
#include "keloplatform/gensqlregexp.h"
#include "kelosyslog/dbutil.h"
#include "kelosyslog/utils.h"

namespace {

// Builds an equality with any of the comma-separated values. Returns false, with `condition` untouched, if
// the value means no restriction.
bool SyslogSQLCondMultiValueGen(_SYSLOG_SQL_COND_tag &condition, _SYSLOG_DB_ATTRI_tag attr,
                                const std::string &value) {
    if (value.empty() || value == "any")
        return false;
    std::list<std::string> values = Tokenize(value, ",");
    condition = {attr, SYSLOG_OP_EQ, values.front(), {}};
    values.pop_front();
    for (const std::string &alternative : values)
        condition.alternatives.push_back({attr, SYSLOG_OP_EQ, alternative, {}});
    return true;
}

void AppendMultiValue(_SYSLOG_DB_ATTRI_tag attr, const std::string &value,
                      std::list<_SYSLOG_SQL_COND_tag> &conditions) {
    _SYSLOG_SQL_COND_tag condition;
    if (SyslogSQLCondMultiValueGen(condition, attr, value))
        conditions.push_back(std::move(condition));
}

void AppendKeyword(const std::string &keyword, std::list<_SYSLOG_SQL_COND_tag> &conditions) {
    if (keyword.empty())
        return;
    const unsigned int failures = kelo::PlatformFailureCount();
    conditions.push_back({SYSLOG_ATTRI_MSG, SYSLOG_OP_RAW, GenSQLRegexp(keyword, "msg"), {}});
    if (kelo::PlatformFailureCount() != failures)
        kelo::FailPlatform("", "GenSQLRegexp");
}

bool IsDateSet(const std::string &date) {
    return !date.empty() && date != "0";
}

void AppendDates(const std::string &from, const std::string &to,
                 std::list<_SYSLOG_SQL_COND_tag> &conditions) {
    if (IsDateSet(from) && from == to) {
        conditions.push_back({SYSLOG_ATTRI_LDATE, SYSLOG_OP_EQ, from, {}});
        return;
    }
    if (IsDateSet(from))
        conditions.push_back({SYSLOG_ATTRI_LDATE, SYSLOG_OP_GE, from, {}});
    if (IsDateSet(to))
        conditions.push_back({SYSLOG_ATTRI_LDATE, SYSLOG_OP_LE, to, {}});
}

} // namespace

void LogSearchCondListGen(const std::string &host, const std::string &level, const std::string &facility,
                          const std::string &program, const std::string &keyword, const std::string &dateFrom,
                          const std::string &dateTo, std::list<_SYSLOG_SQL_COND_tag> &conditions) {
    AppendMultiValue(SYSLOG_ATTRI_HOST, host, conditions);
    AppendMultiValue(SYSLOG_ATTRI_LLEVEL, level, conditions);
    AppendMultiValue(SYSLOG_ATTRI_FAC, facility, conditions);
    AppendMultiValue(SYSLOG_ATTRI_PROG, program, conditions);
    AppendKeyword(keyword, conditions);
    AppendDates(dateFrom, dateTo, conditions);
}
