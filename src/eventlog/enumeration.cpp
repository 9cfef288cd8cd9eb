#include <cstdlib>

#include "common/db_field.h"
#include "eventlog/event_database.h"
#include "kelosyslog/debuger.h"
#include "kelosyslog/logger.h"
#include "kelosyslog/utils.h"

namespace {

std::string EnumerationStatement(int offset, int limit) {
    std::string sql = "SELECT * FROM log ORDER BY time DESC";
    if (limit != 0) {
        const auto decimal = [](int number) {
            return ullNumberToString(static_cast<unsigned long long>(static_cast<long long>(number)));
        };
        sql += " LIMIT " + decimal(limit) + " OFFSET " + decimal(offset);
    }
    return sql;
}

int ReadEvents(DBResult_tag *result, void *context) {
    auto *events = static_cast<std::list<_SSYSLOG_LOG_LOG_tag> *>(context);
    const int rows = KELODBNumRows(result);
    for (int i = 0; i < rows; ++i) {
        uint32_t row = 0;
        if (KELODBFetchRow(result, &row) < 0)
            return 0;
        _SSYSLOG_LOG_LOG_tag &event = events->emplace_back();
        event.id = static_cast<int32_t>(std::strtol(kelo::FieldText(result, row, "id"), nullptr, 10));
        event.level = static_cast<int32_t>(std::strtol(kelo::FieldText(result, row, "level"), nullptr, 10));
        event.time = std::strtoll(kelo::FieldText(result, row, "time"), nullptr, 10);
        event.user = kelo::FieldText(result, row, "user");
        event.event = kelo::FieldText(result, row, "event");
    }
    return 0;
}

} // namespace

std::list<_SSYSLOG_LOG_LOG_tag> Logger::LogEnum(std::string dbPath, int offset, int limit) const {
    std::list<_SSYSLOG_LOG_LOG_tag> events;
    kelo::EventDatabase db(dbPath);
    if (!db.Connect())
        return events;
    const std::string sql = EnumerationStatement(offset, limit);
    if (db->DBExecute(sql, ReadEvents, &events) < 0) {
        Debuger::MSG(0, "Fail to execute SQL command " + sql);
        events.clear();
    }
    return events;
}
