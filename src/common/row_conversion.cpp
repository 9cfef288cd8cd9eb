#include "kelosyslog/records.h"

#include <cstdlib>
#include <cstring>

#include "common/db_field.h"
#include "common/failure.h"

using kelo::FieldText;

namespace {

// Whether `text` consists only of digits and its number fits without a check of the limits. Most numbers of a
// record do; the C library's conversions, which also accept blanks and signs and saturate, take several times
// as long.
bool IsPlainNumber(const char *text, uint64_t &number) {
    constexpr int kSafeDigits = 18;
    number = 0;
    for (int i = 0; i < kSafeDigits; ++i) {
        if (text[i] == '\0')
            return i > 0;
        if (text[i] < '0' || text[i] > '9')
            return false;
        number = number * 10 + static_cast<uint64_t>(text[i] - '0');
    }
    return text[kSafeDigits] == '\0';
}

uint64_t UnsignedField(DBResult_tag *result, uint32_t row, const char *column) {
    const char *text = FieldText(result, row, column);
    uint64_t number = 0;
    return IsPlainNumber(text, number) ? number : std::strtoull(text, nullptr, 10);
}

int64_t SignedField(DBResult_tag *result, uint32_t row, const char *column) {
    const char *text = FieldText(result, row, column);
    uint64_t number = 0;
    return IsPlainNumber(text, number) ? static_cast<int64_t>(number) : std::strtoll(text, nullptr, 10);
}

// As an assignment, which is slower for the same size. In row after row most texts of a column have one.
void TakeText(std::string &field, const char *text) {
    const size_t size = std::strlen(text);
    if (size == field.size())
        std::memcpy(field.data(), text, size);
    else
        field.assign(text, size);
}

int FailForNull() {
    return kelo::Fail(KELO_FAILURE_ARGUMENT, "", "convert a row", "a null pointer");
}

} // namespace

std::string TrimUserName(const std::string &text) {
    const size_t colon = text.find(':');
    return colon == std::string::npos ? text : text.substr(colon + 1);
}

int DBRecToAllLogInfo(DBResult_tag *result, uint32_t row, _SYSLOG_LOG_DATA_tag *log, bool trimUser) {
    if (result == nullptr || log == nullptr)
        return FailForNull();
    log->id = UnsignedField(result, row, "id");
    TakeText(log->host, FieldText(result, row, "host"));
    TakeText(log->ip, FieldText(result, row, "ip"));
    TakeText(log->tag, FieldText(result, row, "tag"));
    TakeText(log->tzoffset, FieldText(result, row, "tzoffset"));
    TakeText(log->ldate, FieldText(result, row, "ldate"));
    TakeText(log->ltime, FieldText(result, row, "ltime"));
    TakeText(log->prog, FieldText(result, row, "prog"));
    TakeText(log->msg, FieldText(result, row, "msg"));
    if (trimUser)
        log->msg = TrimUserName(log->msg);
    log->utcsec = SignedField(result, row, "utcsec");
    TakeText(log->fac, FieldText(result, row, "fac"));
    log->prio = PriorStrToType(FieldText(result, row, "prio"));
    return 0;
}

int DBRecToSysLogInfo(DBResult_tag *result, uint32_t row, _SYSLOG_LOG_DATA_tag *log) {
    if (result == nullptr || log == nullptr)
        return FailForNull();
    log->id = UnsignedField(result, row, "id");
    log->host = FieldText(result, row, "host");
    log->prio = PriorStrToType(FieldText(result, row, "llevel"));
    log->prog = FieldText(result, row, "prog");
    log->ldate = FieldText(result, row, "ldate");
    log->ltime = FieldText(result, row, "ltime");
    log->luser = FieldText(result, row, "luser");
    // Readers of general and connection logs take the message from `event`.
    log->event = FieldText(result, row, "msg");
    return 0;
}

int DBRecToXferLogInfo(DBResult_tag *result, uint32_t row, _SYSLOG_LOG_DATA_tag *log) {
    if (result == nullptr || log == nullptr)
        return FailForNull();
    log->id = UnsignedField(result, row, "id");
    log->host = FieldText(result, row, "host");
    log->prog = FieldText(result, row, "prog");
    log->ldate = FieldText(result, row, "ldate");
    log->ltime = FieldText(result, row, "ltime");
    log->luser = FieldText(result, row, "luser");
    log->event = FieldText(result, row, "event");
    log->fname = FieldText(result, row, "fname");
    log->isdir = UnsignedField(result, row, "isdir");
    log->fsize = FieldText(result, row, "fsize");
    log->xferip = FieldText(result, row, "ip");
    return 0;
}

int DBRecToLogInfo(const std::string &table, DBResult_tag *result, uint32_t row, _SYSLOG_LOG_DATA_tag *log,
                   bool trimUser) {
    if (table == "logs")
        return DBRecToAllLogInfo(result, row, log, trimUser);
    if (table == "general_log" || table == "connection_log")
        return DBRecToSysLogInfo(result, row, log);
    if (table == "transfer_log")
        return DBRecToXferLogInfo(result, row, log);
    return kelo::Fail(KELO_FAILURE_ARGUMENT, "", table, "no log table has this name");
}
