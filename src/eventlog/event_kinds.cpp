#include "eventlog/event_kinds.h"

#include <unistd.h>

#include <memory>

#include "common/report.h"
#include "eventlog/event_database.h"
#include "keloplatform/torvc.h"
#include "kelosyslog/debuger.h"
#include "kelosyslog/logger.h"

namespace {

struct StringPut {
    void operator()(char *text) const { TORVCStrPut(text); }
};

int AddServerEvent(Logger &logger, int level, const char *event) {
    if (event == nullptr || logger.LogAdd(kelo::ServerEventDatabase(), level, "SYSTEM", event) < 0) {
        Debuger::MSG(0, "Fail to add log");
        return -1;
    }
    return 0;
}

// Adds an event of one kind; `arguments` fill its format, which the compiler checks.
template <kelo::EventKind Kind, typename... Arguments>
int AddEvent(Logger &logger, Arguments... arguments) {
    constexpr const char *format = kelo::kEventKinds[Kind].format;
    const std::unique_ptr<char, StringPut> event(TORVCStrGet(format, arguments...));
    return AddServerEvent(logger, kelo::kEventKinds[Kind].level, event.get());
}

} // namespace

int Logger::LogAddServStart(std::string text) {
    return AddEvent<kelo::kServerStart>(*this, text.c_str());
}

int Logger::LogAddServStop(std::string text) {
    return AddEvent<kelo::kServerStop>(*this, text.c_str());
}

int Logger::LogAddNotifyEps(uint64_t eps) {
    return AddEvent<kelo::kNotifyEps>(*this, static_cast<unsigned long long>(eps));
}

int Logger::LogAddNotifySev(std::string sev, std::string content) {
    return AddEvent<kelo::kNotifySeverity>(*this, sev.c_str(), content.c_str());
}

int Logger::LogAddNotifySev(_SYSLOG_DB_PRIORITY_tag prio, std::string content) {
    return LogAddNotifySev(PriorTypeToStr(prio), content);
}

int Logger::LogAddNotifyKw(std::string keyword, std::string content) {
    return AddEvent<kelo::kNotifyKeyword>(*this, keyword.c_str(), content.c_str());
}

int Logger::LogAddArchStart(std::string dbName) {
    return AddEvent<kelo::kArchiveStart>(*this, dbName.c_str());
}

int Logger::LogAddArchFinish(std::string dbName) {
    return AddEvent<kelo::kArchiveFinish>(*this, dbName.c_str());
}

int Logger::LogAddArchFailed(std::string dbName) {
    return AddEvent<kelo::kArchiveFailed>(*this, dbName.c_str());
}

int Logger::LogAddVolFull() {
    const kelo::EventKindRow &row = kelo::kEventKinds[kelo::kVolumeFull];
    const std::unique_ptr<char, StringPut> event(TORVCStrGet("%s", row.format));
    return AddServerEvent(*this, row.level, event.get());
}

int Logger::LogAddLogClear(std::string dbPath, std::string user) {
    return AddServerEvent(*this, kelo::kEventKinds[kelo::kLogClear].level,
                          (dbPath + " was cleared by " + user).c_str());
}

int Logger::LogClear(std::string dbPath, std::string user) {
    unlink(dbPath.c_str());
    if (LogAddLogClear(dbPath, user) < 0) {
        kelo::ReportErrorAt("logger", 638,
                            std::string("Fail to add log [") + kelo::kEventKinds[kelo::kLogClear].format +
                                "]");
    }
    return 0;
}
