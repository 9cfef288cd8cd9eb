// The database handler in the fault loops.

#include "faults/operations.h"
#include "keloplatform/kelodb.h"
#include "kelosyslog/dbhandler.h"

namespace kelo::test {
namespace {

const std::string kSchema = BuildPath("package/schema/archive.sql");

// A handler whose owner disconnects on every way out, as the handler asks for.
struct Connected {
    explicit Connected(const Fixture &fixture)
        : db(fixture.root.File("logs.db"), kSchema), status(db.DBCon()) {}
    ~Connected() { db.DBDiscon(); }
    Connected(const Connected &) = delete;
    Connected &operator=(const Connected &) = delete;

    DBHandler db;
    int status;
};

void SetUpArchive(Fixture &fixture) {
    CreateLogDatabase(fixture.root.File("logs.db"), "archive.sql");
    InsertSampleLogs(fixture.root.File("logs.db"), 10);
}

// Where the database is. SQLite takes some failing reads for damage, which puts it aside.
std::string SoundDatabase(const Fixture &fixture, const Outcome &outcome) {
    const std::string path = fixture.root.File("logs.db");
    const std::string found = outcome.fault == "read" && !fs::exists(path) ? path + ".corrupt" : path;
    EXPECT_TRUE(fs::exists(found));
    EXPECT_EQ(RunSql(found, "PRAGMA integrity_check"), "ok");
    return found;
}

int Change(Fixture &fixture) {
    Connected connected(fixture);
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

void CheckChange(const Fixture &fixture, const Outcome &outcome) {
    const std::string row =
        RunSql(SoundDatabase(fixture, outcome), "SELECT device || start_time FROM db_info");
    if (outcome.IsDone())
        EXPECT_EQ(row, "it's7");
    else
        EXPECT_TRUE(row == "it's7" || row == "0") << row;
    EXPECT_TRUE(outcome.IsDone() || outcome.outOfMemory || !outcome.messages.empty());
}

int Create(Fixture &fixture) {
    return DBHandler(fixture.root.File("logs.db"), kSchema).DBCreate();
}

// There is all of it or nothing, and a second try succeeds.
void CheckCreation(const Fixture &fixture, const Outcome &outcome) {
    const std::string path = fixture.root.File("logs.db");
    if (!outcome.IsDone()) {
        EXPECT_TRUE(outcome.outOfMemory ||
                    testing::Value(outcome.messages, Contains(HasSubstr("Fail to create"))));
        EXPECT_EQ(DBHandler(path, kSchema).DBCreate(), 0);
    }
    EXPECT_EQ(RunSql(path, "SELECT count(*) FROM db_info"), "1");
    EXPECT_EQ(RunSql(path, "PRAGMA journal_mode"), "wal");
    EXPECT_FALSE(fs::exists(path + ".lock"));
}

void SetUpDamaged(Fixture &fixture) {
    WriteFile(fixture.root.File("logs.db"), "damaged");
    WriteFile(fixture.root.File("logs.db-wal"), "companion");
    WriteFile(fixture.root.File("logs.db.corrupt"), "an older one");
    PlatformCalls::answers.onReload = [&] { EXPECT_FALSE(fs::exists(fixture.root.File("logs.db"))); };
}

int Quarantine(Fixture &fixture) {
    return DBErrorHandle_SQLITE_CORRUPT(nullptr, fixture.root.File("logs.db"));
}

// The file is moved once, only after the notification was sent, and never lost.
void CheckQuarantine(const Fixture &fixture, const Outcome &outcome) {
    const bool isMoved = ReadFile(fixture.root.File("logs.db.corrupt")) == "damaged";
    EXPECT_EQ(ReadFile(fixture.root.File(isMoved ? "logs.db.corrupt-wal" : "logs.db-wal")), "companion");
    EXPECT_EQ(ReadFile(fixture.root.File("logs.db.corrupt")) +
                  ReadFile(fixture.root.File("logs.db.corrupt.1")),
              isMoved ? "damagedan older one" : "an older one");
    EXPECT_NE(fs::exists(fixture.root.File("logs.db")), isMoved);
    EXPECT_TRUE(isMoved || !outcome.IsDone());
    EXPECT_TRUE(!isMoved || PlatformCalls::Sent().size() == 1);
    if (outcome.fault.empty()) {
        EXPECT_EQ(PlatformCalls::Sent().at(0).values.at("%DBPATH%"), fixture.root.File("logs.db"));
    }
    const auto isTold = [&](const std::string &text) {
        return testing::Value(outcome.messages, Contains(HasSubstr(text)));
    };
    if (outcome.fault == "KELOSysNotifySendNotificationCustomized") {
        EXPECT_TRUE(!isMoved && isTold("Fail to send notification when db corruption"));
    } else if (outcome.fault == "KELOSystemdReload") {
        EXPECT_TRUE(isMoved && !outcome.IsDone() && isTold("Fail to send HUP signal to syslog-ng"));
    }
}

} // namespace

std::vector<Operation> HandlerOperations() {
    return {
        {"HandlerChanges", true, SetUpArchive, Change, CheckChange, false},
        {"HandlerCreates", false, [](Fixture &) {}, Create, CheckCreation, false},
        {"HandlerQuarantines", false, SetUpDamaged, Quarantine, CheckQuarantine, false},
    };
}

} // namespace kelo::test
