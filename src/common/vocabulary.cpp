#include "kelosyslog/records.h"

#include <array>
#include <cstring>

#include "common/attributes.h"

const char *const g_MappingSyslogPrior[8] = {"emerg",   "alert",  "crit", "err",
                                             "warning", "notice", "info", "debug"};

const char *const g_MappingSyslogOP[11] = {
    "=", "!=", "<", "<=", ">", ">=", "LIKE", "NOT LIKE", "GLOB", "NOT GLOB", nullptr};

const _SYSLOG_XFERLOG_INFO_tag g_xferlog_info[7] = {
    {1, "ftpxfer", "/var/log/kelolog/.FTPXFERDB", 20000, "ftpxferlog"},
    {3, "vuxfmxfer", "/var/log/kelolog/.VUXFMXFERDB", 20000, "filebrowserxferlog"},
    {4, "webdavxfer", "/var/log/kelolog/.WEBDAVXFERDB", 20000, "webdavxferlog"},
    {5, "smbxfer", "/var/log/kelolog/.SMBXFERDB", 100000, "smbxferlog"},
    {6, "afpxfer", "/var/log/kelolog/.AFPXFERDB", 20000, "afpxferlog"},
    {7, "tftpxfer", "/var/log/kelolog/.TFTPXFERDB", 10000, "tftpxferlog"},
    {0, nullptr, nullptr, 0, nullptr},
};

const int32_t g_xferlog_info_count = 7;

namespace {

struct AttributeRow {
    const char *column;
    int32_t isInteger;
};

constexpr std::array<AttributeRow, SYSLOG_ATTRI_NONE> kAttributes = {{
    {"id", 1},     {"host", 0},     {"ip", 0},    {"fac", 0},   {"prio", 0}, {"llevel", 0}, {"tag", 0},
    {"utcsec", 1}, {"tzoffset", 0}, {"ldate", 0}, {"ltime", 0}, {"prog", 0}, {"msg", 0},    {"luser", 0},
    {"event", 0},  {"isdir", 0},    {"fname", 0}, {"fsize", 0}, {"ip", 0},
}};
static_assert(kAttributes[SYSLOG_ATTRI_UTCSEC].isInteger == 1 &&
              kAttributes[SYSLOG_ATTRI_XFERIP].column != nullptr);

} // namespace

const char *LogAttriStrGet(_SYSLOG_DB_ATTRI_tag attr) {
    return attr >= 0 && attr < SYSLOG_ATTRI_NONE ? kAttributes[static_cast<size_t>(attr)].column : "";
}

_SYSLOG_DB_ATTRI_tag LogAttriType(std::string name) {
    int32_t attr = 0;
    while (attr < SYSLOG_ATTRI_NONE && name != kAttributes[static_cast<size_t>(attr)].column)
        ++attr;
    return static_cast<_SYSLOG_DB_ATTRI_tag>(attr);
}

_SYSLOG_DB_PRIORITY_tag PriorStrToType(const char *word) {
    if (word != nullptr) {
        for (int32_t severity = SYSLOG_PRIO_EMERG; severity <= SYSLOG_PRIO_DEBUG; ++severity) {
            // Called for every row of a search; most words differ in their first letter.
            const char *name = g_MappingSyslogPrior[severity];
            if (word[0] == name[0] && std::strcmp(word, name) == 0)
                return static_cast<_SYSLOG_DB_PRIORITY_tag>(severity);
        }
    }
    return SYSLOG_PRIO_DEBUG;
}

std::string PriorTypeToStr(_SYSLOG_DB_PRIORITY_tag prio) {
    return prio >= SYSLOG_PRIO_EMERG && prio <= SYSLOG_PRIO_DEBUG ? g_MappingSyslogPrior[prio] : "";
}

const char *XferlogDBPathGet(const char *name) {
    if (name != nullptr) {
        // The last row ends the table and is never compared.
        for (int32_t i = 0; i < g_xferlog_info_count - 1; ++i) {
            if (std::strcmp(name, g_xferlog_info[i].name) == 0)
                return g_xferlog_info[i].dbPath;
        }
    }
    return "";
}

namespace kelo {

bool IsIntegerAttribute(_SYSLOG_DB_ATTRI_tag attr) {
    return kAttributes[static_cast<size_t>(attr)].isInteger != 0;
}

} // namespace kelo
