// Any bytes can be opened as a database by every operation that opens one, in bounded memory; and an
// operation that only reads leaves the file as it is.

#include <sqlite3.h>

#include <sstream>

#include "folder.h"
#include "keloplatform/kelonotify.h"
#include "keloplatform/root.h"
#include "keloplatform/torvc.h"
#include "kelosyslog/accounting.h"
#include "kelosyslog/dbhandler.h"
#include "kelosyslog/dbutil.h"
#include "kelosyslog/logger.h"
#include "kelosyslog/root.h"
#include "status/server_status.h"

// No database is moved without a notification.
extern "C" int KELOSysNotifySendNotificationCustomized(const char *, const char *, const char *,
                                                       TORVSZHASH **, int) {
    return -1;
}

// No shell creates a database either.
extern "C" int TORVCExec(const char *, const char *, const char *, const char *, const char *) {
    return -1;
}

namespace {

constexpr size_t kPageBytes = 512;
const std::list<_SYSLOG_SQL_COND_tag> kHostA = {{SYSLOG_ATTRI_HOST, SYSLOG_OP_EQ, "a", {}}};
constexpr sqlite3_int64 kMostHeapBytes = 256 << 20;

// The beginning of a header without which SQLite reads no further.
std::string WithHeader(std::string content) {
    if (content.size() >= kPageBytes) {
        content.replace(0, 18, std::string("SQLite format 3\0\x02\0", 18));
        content.replace(20, 4, std::string("\0@  ", 4));
    }
    return content;
}

std::string Root() {
    std::string root = FuzzFolder();
    for (const char *folder :
         {"/var/log/kelosyslog", "/var/log/kelolog", "/usr/kelo/etc", "/usr/kelo/syslog/schema"})
        std::filesystem::create_directories(root + folder);
    SyslogRootSet(root);
    KELORootSet(root.c_str());
    sqlite3_hard_heap_limit64(kMostHeapBytes);
    return root;
}

void Read(const std::string &path) {
    SyslogDBSelect(path, {}, nullptr, nullptr, nullptr, nullptr, true);
    SyslogDBSelect(path, kHostA, nullptr, nullptr, nullptr, nullptr, false);
    SyslogDBSelectCount(path, kHostA, nullptr, nullptr);
    std::list<std::string> values;
    SyslogDBAttriValueGet(path, "host", nullptr, values);
    SyslogDBHistGet(path, 3);
    SyslogDBHistTotalGet(path);
    SyslogDBEpsGet(path, 0, 100);
    Logger().LogEnum(path, 0, 0);
    Logger().LogCount(path);
}

void Change(const std::string &path, const std::string &root) {
    DBHandler db(path, root + "/missing.sql");
    if (db.DBCon() == 0) {
        db.DBLogCountGet();
        db.DBExecute("INSERT INTO logs (host) VALUES ('a')");
        db.DBExecute("DELETE FROM logs WHERE host = 'a'");
        db.DBDiscon();
    }
    SyslogDBDelete(path, kHostA);
}

} // namespace

extern "C" int LLVMFuzzerTestOneInput(const uint8_t *data, size_t size) {
    static const std::string root = Root();
    const std::string content = WithHeader({reinterpret_cast<const char *>(data), size});
    const std::string logs = root + "/var/log/kelosyslog/logs.db";
    const std::string accounting = root + "/var/log/kelolog/.KELOACCOUNTDB";
    const std::string events = root + "/usr/kelo/etc/kelosyslog.db";
    for (const std::string &path : {logs, accounting, events}) {
        for (const char *suffix : {"-journal", "-wal", "-shm"})
            unlink((path + suffix).c_str());
        WriteFuzzFile(path, content);
    }
    Read(logs);
    kelo::tool::GatherStatus({.root = root, .control = "", .timeout = std::chrono::milliseconds(1)});
    std::ostringstream after;
    after << std::ifstream(logs, std::ios::binary).rdbuf();
    if (after.str() != content)
        Fail("reading has changed the database", logs);
    Change(logs, root);
    Logger().LogAddVolFull();
    AccountingManager manager;
    manager.LogInc("a");
    manager.AccoutingFlush2DB();
    return 0;
}
