// A rollback journal beside a database may name a "super-journal", any file, which is deleted with it.
// Whoever can write to the folder of a database can put one there.

#include "support/program_test.h"

namespace kelo::test {
namespace {

constexpr uint32_t kPageBytes = 4096;

std::string BigEndian(uint32_t number) {
    std::string bytes;
    for (int shift = 24; shift >= 0; shift -= 8)
        bytes += static_cast<char>(number >> shift & 0xff);
    return bytes;
}

// The journal of a crash, which changes nothing when it is rolled back, and names the victim.
void WriteHotJournal(const std::string &database, const std::string &victim) {
    const std::string magic = "\xd9\xd5\x05\xf9\x20\xa1\x63\xd7";
    std::string journal = magic + BigEndian(0) + BigEndian(0) +
                          BigEndian(static_cast<uint32_t>(fs::file_size(database)) / kPageBytes) +
                          BigEndian(512) + BigEndian(kPageBytes);
    journal.resize(512);
    uint32_t sum = 0;
    for (const char byte : victim)
        sum += static_cast<uint32_t>(static_cast<signed char>(byte));
    journal += BigEndian((1U << 30) / kPageBytes + 1) + victim +
               BigEndian(static_cast<uint32_t>(victim.size())) + BigEndian(sum) + magic;
    WriteFile(database + "-journal", journal);
}

class SuperJournal : public ProgramTest {
protected:
    // As root, the folders and what is in them belong to two other users: a service, and somebody else.
    void GiveAway() const {
        for (const auto &[folder, uid] :
             std::map<std::string, uid_t>{{"var", 65533}, {"usr/kelo/etc", 65533}, {"home", 65532}})
            for (const auto &entry : fs::recursive_directory_iterator(root_.File(folder)))
                ASSERT_EQ(lchown(entry.path().c_str(), uid, uid), 0);
    }
};

TEST_F(SuperJournal, IsLeftAloneByEveryCommand) {
    const std::string schemas = BuildPath("package/schema/");
    const std::string archive = archives_ + "/nas_2020-01-01_2020-01-01.db";
    const std::string old = root_.File("home/old.db");
    const struct {
        std::string path;
        const char *schema;
    } databases[] = {{logs_, "logs.sql"},
                     {accounting_, "accinfo.sql"},
                     {events_, "kelosyslog.sql"},
                     {archive, "archive.sql"},
                     {old, "archive.sql"}};
    const std::string victim = root_.File("victim");
    std::set<std::string> met; // journals that a command rolled back, and so came to the name in it
    for (const char *mode : {"WAL", "DELETE"}) {
        for (const std::string command : {"search",
                                          "search --db home/old.db",
                                          "search -n 1 -g x",
                                          "search --log nas_2020-01-01_2020-01-01",
                                          "count",
                                          "values host",
                                          "delete --until now -y",
                                          "stats devices",
                                          "stats device nas",
                                          "stats total",
                                          "stats eps --since 2000-01-01",
                                          "report r.html",
                                          "rules test",
                                          "events",
                                          "events count",
                                          "events add server-start 1",
                                          "events export e.html",
                                          "events clear-log home/old.db -y",
                                          "status",
                                          "archive",
                                          "archive --remove-archived -y",
                                          "archive --list",
                                          "archive --prune --keep 1d -y",
                                          "receive",
                                          "receive --db home/old.db",
                                          "parse --db home/old.db",
                                          "parse --db home/old.db --resume",
                                          "db info",
                                          "db check",
                                          "db wal",
                                          "db limit 1 -y",
                                          "db set-device x --db home/old.db",
                                          "db quarantine -y",
                                          "db create --db home/old.db",
                                          "notify status"}) {
            for (const auto &database : databases) {
                for (const char *suffix : {"", "-wal", "-shm", "-journal", ".corrupt"})
                    fs::remove(database.path + suffix);
                fs::create_directories(fs::path(database.path).parent_path());
                RunSql(database.path,
                       ReadFile(schemas + database.schema) + "; PRAGMA journal_mode = " + mode);
                WriteHotJournal(database.path, victim);
            }
            GiveAway();
            WriteFile(victim, "precious");
            const ProgramResult result =
                RunIn(root_.Path(), "echo '" + LogLines(1, 1) + "' | exec kelosyslog --root . " + command);
            EXPECT_TRUE(fs::exists(victim)) << mode << ": " << command << "\n" << result.out << result.err;
            for (const auto &database : databases)
                if (!fs::exists(database.path + "-journal"))
                    met.insert(database.path);
        }
    }
    EXPECT_EQ(met.size(), std::size(databases)) << "the test has no hot journals";
}

} // namespace
} // namespace kelo::test
