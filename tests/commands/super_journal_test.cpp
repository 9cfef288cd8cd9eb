// A rollback journal beside a database may name a "super-journal", any file, which is deleted with it.
// Whoever can write to the folder of a database can put one there.

#include "commands/commands.h"
#include "reference/command_tree.h"
#include "support/program_test.h"

namespace kelo::test {
namespace {

constexpr uint32_t kPageBytes = 4096;
constexpr char kRecord[] = "INSERT INTO logs (host, utcsec) VALUES ('nas', 1577836800);";

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

// A command, and the databases whose journals it rolls back or removes: l the working log, a the accounting,
// e the events, x an archive.
struct Case {
    std::string command;
    const char *arguments;
    const char *opens;
};
const Case kCases[] = {
    {"search", "", "l"},
    {"search", "--log nas_2020-01-01_2020-01-02", "x"},
    {"count", "", "l"},
    {"delete", "--all -y", "l"},
    {"values", "host", "l"},
    {"report", "report.html", "lae"},
    {"stats", "total", "a"},
    {"stats", "devices", "a"},
    {"stats", "forget nas -y", "a"},
    {"events", "", "e"},
    {"events count", "", "e"},
    {"events add", "server-start x", "e"},
    {"events export", "events.html", "e"},
    {"events clear-log", "var/log/kelosyslog/logs.db -y", "le"},
    {"status", "--control none", "lae"},
    {"parse", "--db var/log/kelosyslog/logs.db lines", "l"},
    {"receive", "--db var/log/kelosyslog/logs.db <lines", "lae"},
    {"archive", "--yes", "le"},
    {"archive", "--list", ""}, // read-only: it is not rolled back
    {"archive", "--prune --keep 1d --yes", ""},
    {"retention", "--yes", "l"},
    {"db index", "--build", "l"},
    {"db info", "", "l"},
    {"db check", "", "l"},
    {"db create", "", ""}, // it is there already
    {"db wal", "", "l"},
    {"db limit", "0", "l"},
    {"db set-device", "nas --db var/log/kelosyslog/archive/nas_2020-01-01_2020-01-02.db", "x"},
    {"db quarantine", "--yes", "l"},
    {"db quarantine", "--force --yes", "l"},
    {"db reopen", "", ""},
    {"rules", "list", ""},
    {"cluster init", "new --shard a", ""},
    {"cluster import", "var/log/kelosyslog/logs.db --node 1 --db cluster.conf", "l"},
    {"cluster export", "var/log/kelosyslog/logs.db --db cluster.conf", "l"},
    {"cluster check", "no.conf", ""},
    {"cluster status", "no.conf", ""},
    {"cluster retention", "no.conf --keep 9d", ""},
    {"listen", "", ""},
    {"notify", "list", ""},
};

std::set<std::string> AllCommands() {
    const tool::KelosyslogProgram program;
    std::set<std::string> names;
    const tool::CommandTree tree(*program.app);
    for (const tool::CommandNode &command : tree.Commands())
        if (command.app->get_require_subcommand_min() == 0)
            names.insert(command.path);
    return names;
}

// Every database of the server, in folders of two other users if we are root, each with a journal that names
// the victim.
class SuperJournal : public ProgramTest {
protected:
    struct Database {
        char letter;
        std::string path;
        std::string schema;
        uid_t owner;
    };

    void Build(const std::string &mode) const {
        for (const Database &database : databases_) {
            fs::remove(Template(database));
            RunSql(Template(database), ReadFile(BuildPath("package/schema/" + database.schema)) +
                                           (database.letter == 'l' ? kRecord : "") +
                                           "PRAGMA journal_mode=" + mode);
        }
    }

    void Plant() const {
        for (const Database &database : databases_) {
            const fs::path folder = fs::path(database.path).parent_path();
            fs::remove_all(folder);
            fs::create_directories(folder);
            fs::copy_file(Template(database), database.path);
            WriteHotJournal(database.path, victim_);
            for (const std::string &path : {folder.string(), database.path, database.path + "-journal"})
                ASSERT_TRUE(geteuid() != 0 || chown(path.c_str(), database.owner, database.owner) == 0);
        }
        WriteFile(victim_, "precious");
    }

    std::string RolledBack() const {
        std::string letters;
        for (const Database &database : databases_)
            if (!fs::exists(database.path + "-journal"))
                letters += database.letter;
        return letters;
    }

    void Check(const Case &one) {
        SCOPED_TRACE(one.command + " " + one.arguments);
        Plant();
        const ProgramResult result = Run(one.command + " " + one.arguments);
        EXPECT_TRUE(fs::exists(victim_)) << result.out << result.err;
        EXPECT_EQ(RolledBack(), one.opens) << result.out << result.err;
    }

    const std::string victim_ = root_.File("victim");
    const std::vector<Database> databases_ = {
        {'l', logs_, "logs.sql", 64203},
        {'x', archives_ + "/nas_2020-01-01_2020-01-02.db", "archive.sql", 64203}, // in the folder before it
        {'a', accounting_, "accinfo.sql", 64204},
        {'e', events_, "kelosyslog.sql", 64204},
    };

private:
    std::string Template(const Database &database) const { return templates_.File(database.schema); }

    TempRoot templates_;
};

TEST_F(SuperJournal, IsLeftAloneByEveryCommand) {
    std::set<std::string> covered;
    for (const Case &one : kCases)
        covered.insert(one.command);
    EXPECT_EQ(covered, AllCommands());
    ASSERT_EQ(chmod(root_.Path().c_str(), 0755), 0); // for the other users
    WriteFile(root_.File("lines"), LogLines(1, 2));
    WriteFile(root_.File("etc/kelosyslog/retention.conf"), "keep=\"1d\"\n");
    WriteFile(root_.File("cluster.conf"), "[cluster]\nurl=http://127.0.0.1:1\nuser=u\n");
    ASSERT_EQ(chmod(root_.File("cluster.conf").c_str(), 0600), 0);
    for (const std::string mode : {"WAL", "DELETE"}) {
        SCOPED_TRACE(mode);
        Build(mode);
        for (const Case &one : kCases)
            Check(one);
    }
}

} // namespace
} // namespace kelo::test
