// The database handler in the fault loops.

#include "faults/operations.h"
#include "keloplatform/kelodb.h"
#include "kelosyslog/dbhandler.h"
#include "kelosyslog/root.h"
#include "support/fault_pause.h"
#include "support/notify_calls.h"
#include "support/source_dir.h"
#include "support/system_calls.h"

namespace kelo::test {
namespace {

const std::string kSchema = BuildPath("package/schema/archive.sql");

// A handler whose owner disconnects on every way out, as the handler asks for.
struct Connected {
    explicit Connected(const Fixture &ground)
        : db(ground.root.File("logs.db"), kSchema), status(db.DBCon()) {}
    ~Connected() { db.DBDiscon(); }
    Connected(const Connected &) = delete;
    Connected &operator=(const Connected &) = delete;

    DBHandler db;
    int status;
};

void SetUpArchive(Fixture &ground) {
    NotifyCalls::Reset();
    SystemCalls::Reset();
    SyslogRootSet(ground.root.Path());
    CreateLogDatabase(ground.root.File("logs.db"), "archive.sql");
    InsertSampleLogs(ground.root.File("logs.db"), 10);
}

// Where the database is. SQLite takes some failing reads for damage, which puts it aside.
std::string SoundDatabase(const Fixture &ground, const Outcome &outcome) {
    const std::string path = ground.root.File("logs.db");
    const std::string found = outcome.fault == "read" && !fs::exists(path) ? path + ".corrupt" : path;
    EXPECT_TRUE(fs::exists(found));
    EXPECT_EQ(QueryText(found, "PRAGMA integrity_check"), "ok");
    return found;
}

int Change(Fixture &ground) {
    Connected connected(ground);
    DBHandler &db = connected.db;
    if (connected.status != 0 || db.DBTranStart() != 0)
        return -1;
    const std::string name = db.DBCmdEscape("it's");
    const bool isChanged = db.DBInfoDevSet(name) == 0 && db.DBInfoStartSet(7) == 0 && !name.empty();
    if (!isChanged || db.DBTranEnd() != 0) {
        db.DBTranRollback();
        return -1;
    }
    return db.DBWalCheckpoint(false);
}

void CheckChange(const Fixture &ground, const Outcome &outcome) {
    const std::string row =
        QueryText(SoundDatabase(ground, outcome), "SELECT device || start_time FROM db_info");
    if (outcome.IsDone())
        EXPECT_EQ(row, "it's7");
    else
        EXPECT_TRUE(row == "it's7" || row == "0") << row;
    EXPECT_TRUE(outcome.IsDone() || outcome.outOfMemory || !outcome.messages.empty());
}

void SetUpNothing(Fixture &ground) {
    NotifyCalls::Reset();
    SystemCalls::Reset();
    SyslogRootSet(ground.root.Path());
}

int Create(Fixture &ground) {
    return DBHandler(ground.root.File("logs.db"), kSchema).DBCreate();
}

// Without write-ahead logging it is done too, and says so.
void CheckCreation(const Fixture &ground, const Outcome &outcome) {
    const std::string path = ground.root.File("logs.db");
    const auto hasLine = [&](const std::string &text) {
        return testing::Value(outcome.messages, Contains(HasSubstr(text)));
    };
    if (!outcome.IsDone()) {
        EXPECT_TRUE(outcome.outOfMemory || hasLine("Fail to create"));
        return;
    }
    EXPECT_EQ(QueryText(path, "SELECT count(*) FROM db_info"), "1");
    EXPECT_EQ(QueryText(path, "PRAGMA journal_mode"), hasLine("Fail to set jounal mode") ? "delete" : "wal");
}

void SetUpDamaged(Fixture &ground) {
    SetUpNothing(ground);
    WriteFile(ground.root.File("logs.db"), "damaged");
    WriteFile(ground.root.File("logs.db-wal"), "companion");
    WriteFile(ground.root.File("logs.db.corrupt"), "an older one");
}

int Quarantine(Fixture &ground) {
    {
        const FaultPause pause;
        NotifyCalls::Reset();
        SystemCalls::OnReload([&] { EXPECT_FALSE(fs::exists(ground.root.File("logs.db"))); });
    }
    return DBErrorHandle_SQLITE_CORRUPT(nullptr, ground.root.File("logs.db"));
}

// The file is moved once, only after the notification was sent, and never lost.
void CheckQuarantine(const Fixture &ground, const Outcome &outcome) {
    const bool isMoved = ReadFile(ground.root.File("logs.db.corrupt")) == "damaged";
    EXPECT_TRUE(fs::exists(ground.root.File("logs.db-wal"))) << "the companions stay";
    EXPECT_NE(fs::exists(ground.root.File("logs.db")), isMoved);
    EXPECT_TRUE(isMoved || !outcome.IsDone());
    EXPECT_TRUE(!isMoved || NotifyCalls::Sent().size() == 1);
    if (outcome.fault.empty()) {
        EXPECT_EQ(NotifyCalls::Sent().at(0).values.at("%DBPATH%"), ground.root.File("logs.db"));
    }
    const auto isTold = [&](const std::string &text) {
        return testing::Value(outcome.messages, Contains(HasSubstr(text)));
    };
    if (outcome.fault == "KELOSysNotifySendNotificationCustomized") {
        EXPECT_TRUE(!isMoved && isTold("Fail to send notification when db corruption"));
    } else if (outcome.fault == "KELOSystemdReload") {
        EXPECT_TRUE(isMoved && !outcome.IsDone() && isTold("Fail to send HUP signal to syslog-ng"));
    }
    EXPECT_EQ(NotifyCalls::OpenHandles(), 0);
}

} // namespace

std::vector<Operation> HandlerOperations() {
    return {
        {"HandlerChanges", true, SetUpArchive, Change, CheckChange, false},
        {"HandlerCreates", false, SetUpNothing, Create, CheckCreation, false},
        {"HandlerQuarantines", false, SetUpDamaged, Quarantine, CheckQuarantine, false},
    };
}

} // namespace kelo::test
