// What every command refuses: with its exit status, one line that names the reason, and all files as before.

#include <sys/file.h>

#include "support/program_test.h"

namespace kelo::test {
namespace {

class Refusals : public ProgramTest {
protected:
    struct Case {
        std::string words;
        int status;
        std::string named;
    };

    Refusals() {
        CreateLogDatabase(logs_);
        InsertSampleLogs(logs_, 2000);
        RunSql(logs_, "VACUUM INTO '" + root_.File("damaged.db") + "'");
        fs::copy(root_.File("damaged.db"), root_.File("cut"));
        fs::resize_file(root_.File("cut"), 8192);
        DamagePages(root_.File("damaged.db"));
        CreateLogDatabase(root_.File("checked.db"));
        RunSql(root_.File("checked.db"),
               "INSERT INTO logs(id) VALUES (1); PRAGMA ignore_check_constraints = ON;"
               "CREATE TABLE c (x CHECK (x > 0)); INSERT INTO c VALUES (0)");
        RunSql(root_.File("narrow.db"),
               "CREATE TABLE logs(id INTEGER PRIMARY KEY); INSERT INTO logs VALUES(1)");
        RunSql(root_.File("other\x1b.db"), "CREATE TABLE x(y)");
        CreateLogDatabase(root_.File("firm.db"), "archive.sql");
        RunSql(root_.File("firm.db"),
               "CREATE TRIGGER t BEFORE UPDATE ON db_info BEGIN SELECT RAISE(ABORT, 'never'); END");
        WriteFile(root_.File("text"), std::string(5000, 'x'));
        WriteFile(root_.File("empty"), "");
        WriteFile(root_.File("bad.sql"), "CREATE TABEL x (y);");
        WriteFile(root_.File("in"), LogLines(0, 1));
        fs::create_symlink("loop", root_.File("loop"));
        fs::create_directory(root_.File("busy"));
    }

    static std::string TooMany() {
        std::string values;
        for (int i = 0; i < 500; ++i)
            values += ",a";
        return values;
    }

    // Every file's content, without what SQLite keeps beside a database, locks, and what records failures.
    std::map<std::string, std::string> Files() const {
        std::map<std::string, std::string> files;
        for (const auto &file : fs::recursive_directory_iterator(root_.Path())) {
            const std::string path = file.path();
            if (file.symlink_status().type() == fs::file_type::regular && !path.ends_with("-wal") &&
                !path.ends_with("-shm") && !path.ends_with(".lock") && path != events_)
                files[path] = ReadFile(path);
        }
        return files;
    }

    void ExpectAll(const std::vector<Case> &cases) const {
        const auto files = Files();
        for (const auto &[words, status, named] : cases) {
            SCOPED_TRACE(words);
            const ProgramResult result = Run(words);
            EXPECT_EQ(result.status, status);
            EXPECT_EQ(result.out, "");
            EXPECT_THAT(result.err,
                        AllOf(StartsWith("kelosyslog: "), HasSubstr(named), Not(HasSubstr("\x1b"))));
            EXPECT_EQ(std::count(result.err.begin(), result.err.end(), '\n'), 1) << result.err;
            EXPECT_TRUE(Files() == files);
        }
    }
};

TEST_F(Refusals, NameTheWordOfAWrongCommandLine) {
    ExpectAll({
        {"dance", 2, "dance"},
        {"search -n 0", 2, "--lines: '0'"},
        {"search --since 2021-02-30", 2, "--since: '2021-02-30'"},
        {"search -o xml", 2, "--output: 'xml'"},
        {"search --fields id,nose", 2, "--fields: unknown field 'nose'"},
        {"search -g 'a /(/'", 2, "--grep: 'a /(/': Broken regular expression [(] in a search keyword "},
        {"search -g ' \t'", 2, "--grep"},
        {"search -H a,,b", 2, "--host"},
        {"search -H a" + TooMany(), 2, "--host"},
        {"search -p 8", 2, "'8'"},
        {"search -p err..", 2, "'err..'"},
        {"search -p err...info", 2, "'err...info'"},
        {"search -p '!'", 2, "--priority"},
        {"search --table general_log --facility kern", 2, "--facility"},
        {"search -f -r", 2, "--follow"},
        {"search --table transfer_log -g x", 2, "--grep: table transfer_log"},
        {"count --log host08", 2, "'kelosyslog archive --list'"},
        {"values colour", 2, "'colour'"},
        // Each of these would delete more than was meant.
        {"delete", 2, "--all"},
        {"delete -y --host=", 2, "--host: empty"},
        {"delete --grep= -y", 2, "--grep: empty"},
        {"delete --all -y extra", 2, "extra"},
        {"stats rate", 2, "'rate'"},
        {"stats eps --top 3", 2, "--top"},
        {"stats eps --plot -o json", 2, "--plot"},
        {"status --watch 0", 2, "--watch: '0'"},
        {"db create --db '$(touch hacked).db'", 2, "$(touch hacked).db"},
        {"db create --schema no.sql --db a.db", 2, "no.sql"},
        {"db create --schema '/tmp/a b.sql' --db a.db", 2, "/tmp/a b.sql"},
        {"db limit -1", 2, "-1"},
        {"db limit 2147483648", 2, "2147483648"},
        {"db quarantine --force", 2, "--yes"},
        {"report page.html -S today -U yesterday", 2, "--since"},
        {"events clear-log var/log/kelosyslog/logs.db", 2, "--yes"},
        {"archive --remove-archived", 2, "--yes"},
        {"archive --log ftpxfer", 2, "ftpxfer"},
        {"archive --keep +1d --yes", 2, "+1d"},
        {"archive --prune", 2, "--keep"},
        {"archive --list --device a", 2, "--device"},
        {"parse --db a.db -o csv in", 2, "--output"},
        {"parse --resume in", 2, "--db"},
        {"parse - in - </dev/null", 2, "'-'"},
    });
}

TEST_F(Refusals, SayWhyADatabaseCannotBeRead) {
    std::vector<Case> cases;
    for (const auto &[path, reason] : std::map<std::string, std::string>{
             {"missing", "no such file"},
             {".", "folder"},
             {"text", "not an SQLite database"},
             {"empty", "empty"},
             {"cut", "cut short"},
             {"other\x1b.db", "no usable table 'logs' in it (no such table: logs)"},
             {"damaged.db", "it is damaged (database disk image is malformed)"}}) {
        for (const char *words : {"search", "count", "values host", "delete --all --yes", "search -f"})
            cases.push_back({std::string(words) + " --db '" + path + "'", 3, reason});
    }
    ExpectAll(cases);
}

TEST_F(Refusals, NameTheFileThatCannotBeUsed) {
    const int busy = open(root_.File("busy/.lock").c_str(), O_WRONLY | O_CREAT | O_CLOEXEC, 0600);
    flock(busy, LOCK_EX);
    ExpectAll({
        {"events", 3, events_},
        {"events clear-log text --yes", 3, "text"},
        {"events clear-log gone --yes", 3, "gone"},
        {"report page.html --db none.db", 3, "none.db"},
        {"report page.html --events-db none.db", 3, "none.db"},
        {"report no/page.html", 4, "no/page.html"},
        {"stats eps --db narrow.db", 3, "narrow.db"},
        {"db create --schema bad.sql --db text/a.db", 3, "text: Not a directory"},
        {"db set-device x --db firm.db", 3, "firm.db: never"},
        {"db limit 1 --db busy", 3, "busy: it is no regular file"},
        {"db reopen", 3, "syslog-ng: no systemd, and no pid file "},
        {"db info --db none.db", 3, "none.db"},
        {"db check --db text", 3, "text"},
        {"db quarantine --yes --db none.db", 3, "none.db"},
        {"archive --to none", 4, "none"},
        {"archive --to text", 4, "text"},
        {"archive --to busy", 4, "busy"},
        {"archive --db damaged.db", 3, "damaged.db"},
        {"archive --db checked.db", 3, "checked.db is damaged"},
        {"archive --db none.db", 3, "none.db"},
        {"archive --db loop/x.db", 3, "cannot read " + root_.File("loop/x.db")},
        {"archive --db narrow.db", 3, root_.File("narrow.db") + " cannot be archived"},
        {"parse none", 2, "none: No such file or directory"},
        {"parse --db a.db .", 2, ".: Is a directory"},
        {"parse --db no/a.db in", 3, "no/a.db: No such file or directory"},
        {"parse --db text in", 3, "text: file is not a database"},
        {"parse --db narrow.db in", 3, "narrow.db: "},
        {"parse -o csv in >/dev/full", 4, "No space left on device"},
    });
    close(busy);
    EXPECT_THAT(RunSql(events_, "SELECT event FROM log ORDER BY id DESC"), testing::EndsWith("archived."))
        << "failed ones are recorded";
}

} // namespace
} // namespace kelo::test
