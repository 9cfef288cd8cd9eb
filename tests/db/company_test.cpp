// Processes and threads that need one database at the same moment.

#include <fstream>
#include <thread>

#include "db/db_fixture.h"

namespace kelo::test {
namespace {

class Company : public DbTest {
protected:
    // Runs `work` with the numbers from 0 on in two threads each of so many processes, all at once. Returns
    // how many calls did not give true.
    static int CountFailures(int processes, const std::function<bool(int)> &work) {
        int start[2];
        EXPECT_EQ(pipe(start), 0);
        for (int process = 0; process < processes; ++process) {
            if (fork() != 0)
                continue;
            close(start[1]);
            char none;
            std::ignore = read(start[0], &none, 1);
            bool isOther = false;
            std::thread other([&] { isOther = work(2 * process + 1); });
            const bool isFirst = work(2 * process);
            other.join();
            _exit(2 - isFirst - isOther);
        }
        close(start[0]);
        close(start[1]);
        int failures = 0;
        for (int status = 0; wait(&status) > 0;)
            failures += WIFEXITED(status) ? WEXITSTATUS(status) : 2;
        return failures;
    }

    bool IsConnectedTo(const std::string &table) const {
        DBHandler db(path_, schema_);
        const DBConnectionScope scope(db);
        return db.DBCon() == 0 && db.DBcheckTableExist(table);
    }
    bool Store() const {
        DBHandler db(path_, schema_);
        const DBConnectionScope scope(db);
        return db.DBCon() == 0 && db.DBExecute("INSERT INTO logs(msg) VALUES('x')") == 0;
    }
    std::vector<std::string> Files() const {
        std::vector<std::string> names;
        for (const auto &file : fs::directory_iterator(root_.Path())) {
            if (file.is_regular_file())
                names.push_back(file.path().filename());
        }
        std::sort(names.begin(), names.end());
        return names;
    }

    std::string schema_ = BuildPath("package/schema/archive.sql");
};

TEST_F(Company, CreatesAMissingDatabaseOnceForAll) {
    for (int round = 0; round < 30; ++round) {
        if (round == 20) { // one that runs only once
            schema_ = root_.File("plain.sql");
            WriteFile(schema_, "CREATE TABLE logs (id INTEGER PRIMARY KEY, msg TEXT);");
        }
        EXPECT_EQ(CountFailures(8, [this](int i) { return i % 4 == 0 ? IsConnectedTo("logs") : Store(); }),
                  0);
        EXPECT_EQ(RunSql(path_, "SELECT count(*) FROM logs"), "12");
        EXPECT_EQ(RunSql(path_, "PRAGMA journal_mode"), "wal");
        EXPECT_EQ(Files().front(), "logs.db");
        EXPECT_EQ(Files().size(), round < 20 ? 1u : 2u);
        fs::remove(path_);
    }
}

TEST_F(Company, LosesNoRowWhileADatabaseIsPutAside) {
    for (int round = 0; round < 10; ++round) {
        ASSERT_TRUE(Store());
        EXPECT_EQ(CountFailures(8,
                                [this](int i) {
                                    return i == 3 ? DBErrorHandle_SQLITE_CORRUPT(nullptr, path_) == 0
                                                  : Store();
                                }),
                  0);
        int rows = 0;
        for (const std::string &path : {path_, path_ + ".corrupt"})
            rows += fs::exists(path) ? std::stoi(RunSql(path, "SELECT count(*) FROM logs")) : 0;
        EXPECT_EQ(rows, 16);
        for (const std::string &name : Files())
            fs::remove(root_.File(name));
    }
}

TEST_F(Company, PutsEachDamageAsideOnce) {
    PlatformCalls::answers.notification = std::nullopt; // into the spool, which counts for all processes
    const std::string reloads = root_.File("reloads");
    PlatformCalls::answers.onReload = [&] { std::ofstream(reloads, std::ios::app) << 'r'; };
    CreateLogDatabase(path_, "archive.sql");
    std::vector<std::string> damaged;
    while (damaged.size() < 3) {
        InsertSampleLogs(path_, 200);
        damaged.push_back(DamagePages(path_));
        EXPECT_EQ(CountFailures(4,
                                [this](int) {
                                    for (int i = 0; i < 3; ++i) {
                                        DBHandler db(path_, schema_);
                                        const DBConnectionScope scope(db);
                                        if (db.DBCon() != 0)
                                            return false;
                                        db.DBInfoStartStrGet();
                                        db.DBInfoEndStrGet();
                                    }
                                    return Store();
                                }),
                  0);
        EXPECT_EQ(RunSql(path_, "SELECT count(*) FROM logs"), "8");
        EXPECT_EQ(ReadFile(reloads).size(), damaged.size());
        const fs::directory_iterator spool(root_.File("var/spool/kelonotify/new"));
        EXPECT_EQ(static_cast<size_t>(std::distance(begin(spool), end(spool))), damaged.size());
        EXPECT_EQ(ReadFile(path_ + ".corrupt"), damaged.back());
    }
    EXPECT_EQ(ReadFile(path_ + ".corrupt.1"), damaged[0]);
    EXPECT_EQ(ReadFile(path_ + ".corrupt.2"), damaged[1]);
}

} // namespace
} // namespace kelo::test
