#include "eventlog/event_kinds.h"

#include <memory>

#include "common/failure.h"
#include "common/report.h"
#include "db/database_files.h"
#include "db/database_lock.h"
#include "eventlog/event_database.h"
#include "keloplatform/torvc.h"
#include "kelosyslog/debuger.h"
#include "kelosyslog/logger.h"

namespace {

struct StringPut {
    void operator()(char *text) const { TORVCStrPut(text); }
};

int AddServerEvent(const Logger &logger, int level, const char *event) {
    if (event == nullptr)
        kelo::FailPlatform("", "TORVCStrGet");
    if (event == nullptr || logger.LogAdd(kelo::ServerEventDatabase(), level, "SYSTEM", event) < 0) {
        Debuger::MSG(0, "Fail to add log");
        return -1;
    }
    return 0;
}

// Adds an event of one kind; `arguments` fill its format, which the compiler checks.
template <kelo::EventKind Kind, typename... Arguments>
int AddEvent(const Logger &logger, Arguments... arguments) {
    constexpr const char *format = kelo::kEventKinds[Kind].format;
    const std::unique_ptr<char, StringPut> event(TORVCStrGet(format, arguments...));
    return AddServerEvent(logger, kelo::kEventKinds[Kind].level, event.get());
}

} // namespace

int Logger::LogAddServStart(std::string text) const {
    return AddEvent<kelo::kServerStart>(*this, text.c_str());
}

int Logger::LogAddServStop(std::string text) const {
    return AddEvent<kelo::kServerStop>(*this, text.c_str());
}

int Logger::LogAddNotifyEps(uint64_t eps) const {
    return AddEvent<kelo::kNotifyEps>(*this, static_cast<unsigned long long>(eps));
}

int Logger::LogAddNotifySev(std::string sev, std::string content) const {
    return AddEvent<kelo::kNotifySeverity>(*this, sev.c_str(), content.c_str());
}

int Logger::LogAddNotifySev(_SYSLOG_DB_PRIORITY_tag prio, std::string content) const {
    return LogAddNotifySev(PriorTypeToStr(prio), content);
}

int Logger::LogAddNotifyKw(std::string keyword, std::string content) const {
    return AddEvent<kelo::kNotifyKeyword>(*this, keyword.c_str(), content.c_str());
}

int Logger::LogAddArchStart(std::string dbName) const {
    return AddEvent<kelo::kArchiveStart>(*this, dbName.c_str());
}

int Logger::LogAddArchFinish(std::string dbName) const {
    return AddEvent<kelo::kArchiveFinish>(*this, dbName.c_str());
}

int Logger::LogAddArchFailed(std::string dbName) const {
    return AddEvent<kelo::kArchiveFailed>(*this, dbName.c_str());
}

int Logger::LogAddVolFull() const {
    const kelo::EventKindRow &row = kelo::kEventKinds[kelo::kVolumeFull];
    const std::unique_ptr<char, StringPut> event(TORVCStrGet("%s", row.format));
    return AddServerEvent(*this, row.level, event.get());
}

int Logger::LogAddLogClear(std::string dbPath, std::string user) const {
    return AddServerEvent(*this, kelo::kEventKinds[kelo::kLogClear].level,
                          (dbPath + " was cleared by " + user).c_str());
}

int Logger::LogClear(std::string dbPath, std::string user) const {
    {
        const kelo::DatabaseLock lock(dbPath);
        if (lock.MayGoOn())
            kelo::RemoveDatabase(dbPath);
    }
    if (LogAddLogClear(dbPath, user) < 0) {
        kelo::ReportErrorAt("logger", 638,
                            std::string("Fail to add log [") + kelo::kEventKinds[kelo::kLogClear].format +
                                "]");
    }
    return 0;
}
