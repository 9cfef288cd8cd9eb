#include <dlfcn.h>
#include <sqlite3.h>

#include <filesystem>

#include "db/db_fixture.h"
#include "kelosyslog/notification.h"

namespace {

int injectedCode = 0; // 0 for SQLite's own

} // namespace

extern "C" int sqlite3_errcode(sqlite3 *db) {
    static const auto real =
        reinterpret_cast<decltype(&sqlite3_errcode)>(dlsym(RTLD_NEXT, "sqlite3_errcode"));
    return injectedCode != 0 ? injectedCode : real(db);
}

namespace kelo::test {
namespace {

using testing::ElementsAre;
using testing::IsEmpty;
using testing::MatchesRegex;
namespace fs = std::filesystem;

class DBErrorHandle : public DbTest {
protected:
    ~DBErrorHandle() override { injectedCode = 0; }
};

// The text without the source line, which is nobody's business.
std::string WithoutLine(const std::string &text) {
    EXPECT_THAT(text, MatchesRegex("dbhandler:[0-9]+ .*"));
    return text.substr(text.find(' ') + 1);
}

TEST_F(DBErrorHandle, ChoosesThePriorityByTheErrorCode) {
    Connect();
    const struct {
        int code;
        bool hasLogs;
        bool isError;
    } cases[] = {
        {SQLITE_ERROR, true, false}, {SQLITE_ERROR, false, true},  {SQLITE_BUSY, false, false},
        {SQLITE_EMPTY, true, false}, {SQLITE_NOTADB, true, false}, {SQLITE_LOCKED, true, true},
        {SQLITE_FULL, true, true},   {SQLITE_IOERR, true, true},
    };
    const std::string sql = "SELECT '100%s %n' FROM gone";
    for (const auto &c : cases) {
        SCOPED_TRACE(c.code);
        injectedCode = 0;
        RunSql(path_, c.hasLogs ? "CREATE TABLE IF NOT EXISTS logs (id)" : "DROP TABLE IF EXISTS logs");
        injectedCode = c.code;
        EXPECT_EQ(db_.DBExecute(sql), -1);
        const auto messages = Messages();
        ASSERT_EQ(messages.size(), 1u);
        EXPECT_EQ(messages[0].priority, c.isError ? Error("").priority : Info("").priority);
        EXPECT_EQ(WithoutLine(messages[0].text), "Fail to execute SQL command: " + sql +
                                                     ", error code is : " + std::to_string(c.code) +
                                                     ", error cause: no such table: gone");
    }
    EXPECT_TRUE(fs::exists(path_));
    EXPECT_THAT(NotifyCalls::Sent(), IsEmpty());
}

TEST_F(DBErrorHandle, EndsWhenItsOwnQuestionFails) {
    Connect();
    injectedCode = SQLITE_ERROR;
    PlatformCalls::FailFrom(1);
    EXPECT_EQ(db_.DBExecute("SELECT 1"), -1);
    const auto messages = Messages();
    ASSERT_EQ(messages.size(), 3u); // the question, its report, the statement
    EXPECT_EQ(messages[2].priority, Error("").priority);
    EXPECT_EQ(WithoutLine(messages[2].text).rfind("Fail to execute SQL command: SELECT 1,", 0), 0u);
    EXPECT_EQ(PlatformCalls::Statements().size(), 2u);
}

TEST_F(DBErrorHandle, QuarantinesACorruptDatabaseAndGoesOn) {
    Connect(200);
    db_.DBWalCheckpoint(false);
    db_.DBDiscon();
    std::string content = ReadFile(path_);
    for (size_t page = 4096; page < content.size(); page += 4096)
        content.replace(page, 8, 8, '\xff'); // no kind of page
    WriteFile(path_, content);
    WriteFile(path_ + "-wal", "");
    WriteFile(path_ + ".corrupt", "an older one");
    bool wasMovedBeforeTheReload = false;
    SystemCalls::OnReload([&] { wasMovedBeforeTheReload = !fs::exists(path_); });
    ASSERT_EQ(db_.DBCon(), 0);
    PlatformCalls::Reset();

    EXPECT_EQ(db_.DBExecute("SELECT count(*) FROM logs"), -1);
    EXPECT_TRUE(wasMovedBeforeTheReload);
    EXPECT_EQ(ReadFile(path_ + ".corrupt"), content);
    EXPECT_TRUE(fs::exists(path_ + "-wal")) << "the companions stay";
    ASSERT_EQ(NotifyCalls::Sent().size(), 1u);
    EXPECT_EQ(NotifyCalls::Sent()[0].tag, "KELOSYSLOG_DB_CORRUPT");
    EXPECT_EQ(NotifyCalls::Sent()[0].values.at("%DBPATH%"), path_);
    EXPECT_THAT(Calls({"KELOSystemdReload"}), ElementsAre("KELOSystemdReload syslog-ng"));
    const auto messages = Messages();
    EXPECT_EQ(messages.back().priority, Error("").priority);
    EXPECT_EQ(WithoutLine(messages.back().text),
              "Fail to execute SQL command: SELECT count(*) FROM logs, error code is : 11, "
              "error cause: database disk image is malformed");
    EXPECT_TRUE(db_.isConnected());
}

TEST_F(DBErrorHandle, StopsTheQuarantineAtTheFirstStepThatFails) {
    const struct {
        const char *name;
        std::function<void()> arrange;
        bool isMoved;
        std::string message;
        size_t reloads;
    } cases[] = {
        {"notification", [] { NotifyCalls::AnswerWith(-1); }, false,
         "Fail to send notification when db corruption", 0},
        {"rename", [this] { fs::create_directory(path_ + ".corrupt"); }, false, "", 0},
        {"reload", [] { SystemCalls::AnswerReloadWith(false); }, true, "Fail to send HUP signal to syslog-ng",
         1},
    };
    for (const auto &c : cases) {
        SCOPED_TRACE(c.name);
        fs::remove_all(path_ + ".corrupt");
        WriteFile(path_, "damaged");
        PlatformCalls::Reset();
        NotifyCalls::Reset();
        SystemCalls::Reset();
        c.arrange();
        Messages();
        EXPECT_EQ(DBErrorHandle_SQLITE_CORRUPT(nullptr, path_), -1);
        EXPECT_EQ(fs::exists(path_), !c.isMoved);
        EXPECT_EQ(Calls({"KELOSystemdReload"}).size(), c.reloads);
        // The manager reports the missing rule file, and the gateway its own failure.
        auto texts = log_.Texts();
        std::erase_if(texts, [](const std::string &text) { return text.rfind("dbhandler:", 0) != 0; });
        ASSERT_EQ(texts.size(), c.message.empty() ? 0u : 1u);
        if (!texts.empty()) {
            EXPECT_EQ(WithoutLine(texts[0]), c.message);
        }
    }
}

} // namespace
} // namespace kelo::test
