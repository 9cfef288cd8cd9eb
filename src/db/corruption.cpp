#include <cstdio>

#include "common/report.h"
#include "common/string_map.h"
#include "keloplatform/kelosystem.h"
#include "kelosyslog/dbhandler.h"
#include "kelosyslog/notification.h"

int32_t DBErrorHandle_SQLITE_CORRUPT(DBConnect_tag *, std::string dbPath) {
    NotificationManager notifications;
    kelo::SzHash placeholders;
    if (!placeholders)
        return -1;
    placeholders.Set("%DBPATH%", dbPath);
    if (notifications.NotificationSend("KELOSYSLOG_DB_CORRUPT", placeholders.Address()) < 0) {
        kelo::ReportErrorAt("dbhandler", __LINE__, "Fail to send notification when db corruption");
        return -1;
    }
    if (std::rename(dbPath.c_str(), (dbPath + ".corrupt").c_str()) != 0)
        return -1;
    if (!KELOSystemdReload("syslog-ng")) {
        kelo::ReportErrorAt("dbhandler", __LINE__, "Fail to send HUP signal to syslog-ng");
        return -1;
    }
    return 0;
}
