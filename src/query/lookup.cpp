#include <array>
#include <cstdlib>

#include "common/db_field.h"
#include "common/failure.h"
#include "common/report.h"
#include "query/statement.h"

using namespace kelo;

namespace {

// The place of the names of one kind: in databases of generation 1 a table of keys and names, in those of
// generation 2 a column of table "logs".
struct NameSource {
    const char *keyTable;
    const char *keyColumn;
    const char *nameColumn;
    const char *logColumn;
};

constexpr std::array<NameSource, 4> kNameSources = {{
    {"hosts", "host_id", "host_name", "host"},
    {"progs", "prog_id", "prog_name", "prog"},
    {"tags", "tag_id", "tag_name", "tag"},
    {"facs", "fac_id", "fac_name", "fac"},
}};

using Names = std::map<uint64_t, std::string>;

bool AskKeyTable(const std::string &dbPath, const NameSource &source, Names &names) {
    const std::string sql = std::string("SELECT * FROM ") + source.keyTable;
    return AskRows(dbPath, sql, nullptr, [&](DBResult_tag *result, uint32_t row) {
        const uint64_t key = std::strtoull(FieldText(result, row, source.keyColumn), nullptr, 10);
        names.emplace(key, FieldText(result, row, source.nameColumn));
    });
}

bool AskLogs(const std::string &dbPath, const NameSource &source, Names &names) {
    const std::string sql = std::string("SELECT DISTINCT ") + source.logColumn + " FROM logs";
    uint64_t number = 0;
    return AskRows(dbPath, sql, nullptr, [&](DBResult_tag *result, uint32_t row) {
        names.emplace(number++, FieldText(result, row, source.logColumn));
    });
}

} // namespace

int SyslogDBVersionGet(const std::string &dbPath) {
    if (!SyslogDBPathIsValid(dbPath)) {
        ReportErrorAt("dbutil", 863, "Invalid syslog db path! [" + dbPath + "]");
        FailForPath(dbPath);
        return 1;
    }
    const DbConnection connection = ConnectOrFail(dbPath);
    if (connection == nullptr)
        return 1;
    DbResult result; // a query that fails is an answer
    return RunQuery(connection.get(), "SELECT * FROM db_info", nullptr, result) ? 1 : 2;
}

int SyslogDBAttriValueGet(const std::string &dbPath, const std::string &name, _SYSLOG_SQL_LIMIT_tag *limit,
                          std::list<std::string> &values) {
    if (!CheckDbPath(dbPath, 705))
        return -1;
    if (LogAttriType(name) == SYSLOG_ATTRI_NONE) {
        ReportErrorAt("dbutil", 710, "Log attribute type is incorrect!");
        return Fail(KELO_FAILURE_COLUMN, dbPath, name, "no log table has this column");
    }
    const std::string sql = "SELECT " + name + " FROM logs GROUP BY " + name + " ORDER BY " + name + " asc";
    const bool isComplete = AskRows(dbPath, sql, limit, [&](DBResult_tag *result, uint32_t row) {
        values.emplace_back(FieldText(result, row, name.c_str()));
    });
    return isComplete ? 0 : -1;
}

int SyslogDBExtkeyMapGet(const std::string &dbPath, _SYSLOG_EXTKEY_TB_TYPE_tag type,
                         std::map<uint64_t, std::string> &names) {
    const int generation = SyslogDBVersionGet(dbPath);
    if (!CheckDbPath(dbPath, 897))
        return -1;
    if (type < SYSLOG_EXTKEY_HOST || type > SYSLOG_EXTKEY_FAC)
        return Fail(KELO_FAILURE_ARGUMENT, dbPath, "", "no such kind of name");
    const NameSource &source = kNameSources[static_cast<size_t>(type)];
    const bool isComplete =
        generation == 1 ? AskKeyTable(dbPath, source, names) : AskLogs(dbPath, source, names);
    return isComplete ? 0 : -1;
}

uint64_t SyslogDBExtkeyLookupByName(const std::string &dbPath, _SYSLOG_EXTKEY_TB_TYPE_tag type,
                                    std::string name) {
    std::map<uint64_t, std::string> names;
    if (SyslogDBExtkeyMapGet(dbPath, type, names) != 0) {
        ReportErrorAt("dbutil", 966, "Fail to get foreign key map");
        return 0;
    }
    for (const auto &[key, value] : names) {
        if (value == name)
            return key;
    }
    return 0;
}
