#include <ctime>

#include "common/failure.h"
#include "db/first_row.h"
#include "kelosyslog/dbhandler.h"
#include "kelosyslog/debuger.h"
#include "kelosyslog/utils.h"

namespace {

// Runs a query that yields one 32-bit number in the first row's column `COLUMN`. `number` keeps its value
// without a row.
struct NumberQuery {
    const char *column;
    int64_t number;

    static int Read(DBResult_tag *result, void *context) {
        auto *query = static_cast<NumberQuery *>(context);
        uint32_t row = 0;
        if (kelo::FirstRow(result, row))
            query->number = kelo::ParseInt32(kelo::FieldText(result, row, query->column));
        return 0;
    }
};

// The time of the first record in the given order of time; 0 for none and on failure.
int64_t TimeOfFirstLog(DBHandler &db, const char *direction) {
    const std::string sql = std::string("SELECT * FROM logs ORDER BY utcsec ") + direction + " LIMIT 1";
    NumberQuery query{"utcsec", 0};
    if (db.DBExecute(sql, NumberQuery::Read, &query) != 0) {
        // A new database without records is normal.
        if (db.DBcheckTableExist("logs"))
            Debuger::MSG(0, "Fail to execute SQL command: " + sql);
        return 0;
    }
    return query.number;
}

std::string LocalDate(int64_t utcsec) {
    const time_t time = static_cast<int32_t>(utcsec);
    tm parts{};
    tzset(); // localtime_r need not
    localtime_r(&time, &parts);
    char text[1024] = {};
    std::strftime(text, sizeof text, "%Y-%m-%d", &parts);
    return text;
}

int UpdateInfo(DBHandler &db, const std::string &assignment) {
    const std::string sql = "UPDATE db_info SET " + assignment + " WHERE id=1";
    if (db.DBExecute(sql) != 0) {
        Debuger::MSG(0, "Fail to execute SQL command: " + sql);
        return -1;
    }
    return 0;
}

int ReadInfo(DBResult_tag *result, void *context) {
    auto *info = static_cast<_ARCH_DB_INFO_tag *>(context);
    uint32_t row = 0;
    if (kelo::FirstRow(result, row)) {
        info->start_time = kelo::ParseInt32(kelo::FieldText(result, row, "start_time"));
        info->end_time = kelo::ParseInt32(kelo::FieldText(result, row, "end_time"));
        info->log_count = std::strtoull(kelo::FieldText(result, row, "log_count"), nullptr, 10);
        info->device = kelo::FieldText(result, row, "device");
    }
    return 0;
}

} // namespace

int64_t DBHandler::DBLogCountGet() {
    NumberQuery query{"count_result", -1}; // a count whose row cannot be fetched has failed
    constexpr char kCount[] = "SELECT COUNT(*) as count_result FROM logs";
    if (DBExecute(kCount, NumberQuery::Read, &query) != 0)
        return -1;
    if (query.number == -1)
        kelo::Fail(KELO_FAILURE_OTHER, dbPath_, kCount, "the statement gave no row");
    return query.number;
}

int64_t DBHandler::DBLogStartTimeGet() {
    return TimeOfFirstLog(*this, "ASC");
}
int64_t DBHandler::DBLogEndTimeGet() {
    return TimeOfFirstLog(*this, "DESC");
}

int64_t DBHandler::DBInfoCntGet() {
    return DBLogCountGet();
}
int64_t DBHandler::DBInfoStartGet() {
    return DBLogStartTimeGet();
}
int64_t DBHandler::DBInfoEndGet() {
    return DBLogEndTimeGet();
}

std::string DBHandler::DBInfoStartStrGet() {
    const int64_t time = DBLogStartTimeGet();
    if (time == 0)
        Debuger::MSG(0, "Fail to get database start time");
    return LocalDate(time);
}

std::string DBHandler::DBInfoEndStrGet() {
    const int64_t time = DBLogEndTimeGet();
    if (time == 0)
        Debuger::MSG(0, "Fail to get database end time");
    return LocalDate(time);
}

int DBHandler::DBInfoStartSet(unsigned long long startTime) {
    return UpdateInfo(*this, "start_time='" + ullNumberToString(startTime) + "'");
}

int DBHandler::DBInfoEndSet(unsigned long long endTime) {
    return UpdateInfo(*this, "end_time='" + ullNumberToString(endTime) + "'");
}

int DBHandler::DBInfoDevSet(std::string device) {
    return UpdateInfo(*this, "device='" + device + "'");
}

int DBHandler::DBInfoGet(_ARCH_DB_INFO_tag &info) {
    const std::string sql = "SELECT * FROM db_info";
    _ARCH_DB_INFO_tag row;
    if (DBExecute(sql, ReadInfo, &row) != 0) {
        Debuger::MSG(0, "Fail to execute SQL command: " + sql);
        return -1;
    }
    info = row;
    return 0;
}
