#include "platform/db_fixture.h"

namespace kelo::test {
namespace {

class Connecting : public testing::Test {
protected:
    Connecting() { fs::permissions(root.Path(), fs::perms::all); }

    std::string MakeLogs(const std::string &name, const std::string &journalMode = "delete") {
        const std::string path = root.File(name);
        RunSql(
            path,
            "PRAGMA journal_mode=" + journalMode +
                "; CREATE TABLE logs(id INTEGER PRIMARY KEY, msg TEXT); INSERT INTO logs(msg) VALUES('one')");
        return path;
    }
    static std::string CountLogs(const Connection &connection) {
        const Outcome outcome = Execute(connection, "SELECT count(*) AS n FROM logs", {"n"});
        return outcome.status == 0 ? *outcome.rows[0][0] : outcome.error;
    }

    TempRoot root;
};

TEST_F(Connecting, GivesNullAndCreatesNothingForWhatIsNoFile) {
    fs::create_symlink("nowhere", root.File("dangling"));
    ASSERT_EQ(mkfifo(root.File("fifo").c_str(), 0666), 0);
    const std::string logs = MakeLogs("logs.db");
    for (const std::string &path :
         {std::string(), root.File("missing.db"), root.Path(), root.File("fifo"), root.File("dangling"),
          std::string(":memory:"), "file:" + logs + "?mode=rwc", std::string(5000, 'x')})
        EXPECT_EQ(ConnectTo(path), nullptr) << path;
    EXPECT_EQ(KELODBConnect(nullptr, nullptr, nullptr, nullptr), nullptr);
    EXPECT_EQ(std::distance(fs::directory_iterator(root.Path()), {}), 3);
    EXPECT_EQ(KELODBClose(nullptr), 0);
    EXPECT_EQ(KELODBInternalDBHdlGet(nullptr), nullptr);
    EXPECT_STRNE(KELODBErrorGet(nullptr), "");
}

TEST_F(Connecting, KeepsSqlInsideTheFile) {
    const std::string logs = MakeLogs("logs.db");
    const Connection connection = ConnectTo(logs);
    for (const std::string &sql :
         {"ATTACH '" + logs + "' AS other", std::string("ATTACH ':memory:' AS other"),
          "VACUUM INTO '" + root.File("copy.db") + "'", std::string("SELECT load_extension('libm.so.6')"),
          std::string("SELECT fts3_tokenizer('simple', x'00')")})
        EXPECT_EQ(Execute(connection, sql).status, -1) << sql;
    Execute(connection, "PRAGMA writable_schema=ON");
    EXPECT_EQ(Execute(connection, "DELETE FROM sqlite_schema").status, -1);
    EXPECT_FALSE(fs::exists(root.File("copy.db")));
    EXPECT_EQ(Execute(connection, "VACUUM").status, 0);
    // A view that a damaged or hostile file brings along may call nothing that has effects.
    RunSql(logs, "CREATE VIEW bait AS SELECT fts3_tokenizer('simple') AS a, 1 AS b, 2 AS c");
    EXPECT_THAT(Execute(connection, "SELECT * FROM bait").error, HasSubstr("unsafe use"));
}

// Acts as user nobody during the lifetime of the object, because root ignores permissions.
struct Unprivileged {
    Unprivileged() { EXPECT_TRUE(getuid() != 0 || seteuid(65534) == 0); }
    ~Unprivileged() { EXPECT_TRUE(getuid() != 0 || seteuid(0) == 0); }
};

// A database in WAL mode, in a folder where the reader can create no file.
TEST_F(Connecting, ReadsWalInAReadOnlyFolderUntilSomebodyWrites) {
    const std::string logs = MakeLogs("logs ?#%41.db", "wal");
    const std::string secret = MakeLogs("secret.db");
    for (const auto &entry : fs::directory_iterator(root.Path()))
        fs::permissions(entry, fs::perms{0744});
    fs::permissions(root.Path(), fs::perms{0555});
    fs::permissions(secret, fs::perms::none);
    Connection connection;
    {
        const Unprivileged rights;
        EXPECT_EQ(ConnectTo(secret), nullptr);
        connection = ConnectTo(logs);
        EXPECT_EQ(CountLogs(connection), "1");
        EXPECT_EQ(Execute(connection, "DELETE FROM logs").errorCode, SQLITE_READONLY);
    }
    fs::permissions(root.Path(), fs::perms::owner_all);
    RunSql(logs, "INSERT INTO logs(msg) VALUES('two')");
    const Outcome outcome = Execute(connection, "SELECT * FROM logs");
    EXPECT_EQ(outcome.errorCode, SQLITE_BUSY);
    EXPECT_THAT(outcome.error, HasSubstr("changed"));
    EXPECT_FALSE(outcome.hasResult);
}

} // namespace
} // namespace kelo::test
