// JSON of every command that prints, errors as JSON, and errors that name what was meant.

#include <json/json.h>

#include "commands/commands.h"
#include "reference/command_tree.h"
#include "support/program_test.h"

namespace kelo::test {
namespace {

class Forms : public ProgramTest {
protected:
    Forms() {
        CreateLogDatabase(logs_);
        InsertSampleLogs(logs_, 20);
        CreateLogDatabase(accounting_, "accinfo.sql");
        CreateLogDatabase(events_, "kelosyslog.sql");
        fs::create_directories(archives_);
        fs::create_directories(root_.File("etc/kelosyslog/syslog-ng"));
        fs::copy(SourcePath("package/syslog-ng/kelosyslog.conf"), root_.File("etc/kelosyslog/syslog-ng"));
        WriteFile(root_.File("in"), LogLines(0, 1));
        WriteFile(root_.File("etc/kelosyslog/retention.conf"), "keep_size=\"20G\"\n");
    }
};

// Each command stands here, so that a new one is not forgotten: words that make it print, or none if it never
// does.
TEST_F(Forms, AreJsonForEveryCommandThatPrints) {
    const std::map<std::string, std::vector<std::string>> runs = {
        {"search", {"-n 2"}},
        {"count", {"", "--limit 3", "--by 1h", "--by host", "--buckets 4", "--estimate"}},
        {"delete", {"--all --dry-run", "--yes -H nobody"}},
        {"events", {"", "--follow --idle 0"}},
        {"events count", {""}},
        {"events add", {}},
        {"events export", {}},
        {"events clear-log", {}},
        {"report", {}},
        {"values", {"host", "host --counts", "host -p err"}},
        {"stats", {"devices", "device x", "total", "eps", "eps --empty", "forget --below 9 --dry-run"}},
        {"rules", {"list", "test", "test --text x"}},
        {"notify", {"status", "list"}},
        {"parse", {"in"}},
        {"receive", {}},
        {"db", {}},
        {"db info", {""}},
        {"db check", {""}},
        {"db create", {"--db new.db"}},
        {"db wal", {""}},
        {"db limit", {"1000000"}},
        {"db set-device", {"nas --db archive.db"}},
        {"db quarantine", {"--yes --force --db copy.db"}},
        {"db reopen", {""}},
        {"db index", {"", "--remove"}},
        {"archive", {"--dry-run", "--list", "--yes", "--prune --keep 1d --yes"}},
        {"retention", {"--dry-run", "--yes"}},
        {"listen", {""}},
        {"status", {""}},
        {"cluster", {}},
        {"cluster init", {"new --shard a"}},
        {"cluster import", {}}, // needs servers, which tests/cluster has
        {"cluster export", {}},
        {"cluster check", {"cluster.conf"}},
        {"cluster status", {"cluster.conf"}},
        {"cluster retention", {"cluster.conf --keep 9d --dry-run"}},
    };
    CreateLogDatabase(root_.File("archive.db"), "archive.sql");
    CreateLogDatabase(root_.File("copy.db"));
    WriteFile(root_.File("cluster.conf"), "[cluster]\nurl=http://127.0.0.1:1\nuser=u\n"); // nobody is there
    fs::permissions(root_.File("cluster.conf"), fs::perms(0600));
    RunSql(accounting_, "INSERT INTO histogram(device, count) VALUES ('a', 3)");
    const tool::KelosyslogProgram program;
    const tool::CommandTree tree(*program.app);
    for (const tool::CommandNode &command : tree.Commands()) {
        if (command.path.empty())
            continue;
        const auto found = runs.find(command.path);
        ASSERT_TRUE(found != runs.end()) << command.path;
        for (const std::string &words : found->second) {
            const ProgramResult result = Run(command.path + " " + words + " -o json");
            SCOPED_TRACE(command.path + " " + words + "\n" + result.out + result.err);
            Json::Value value;
            const std::unique_ptr<Json::CharReader> reader(Json::CharReaderBuilder().newCharReader());
            const char *end = result.out.data() + result.out.size();
            const bool mayFail = command.path == "db reopen"; // no syslog-ng runs
            EXPECT_TRUE(mayFail || reader->parse(result.out.data(), end, &value, nullptr));
            EXPECT_EQ(result.err.find("not expected"), std::string::npos);
        }
    }
}

TEST_F(Forms, OfErrorsAreJsonOnRequest) {
    WriteFile(root_.File("text"), std::string(5000, 'x'));
    fs::create_directories(root_.File("q\"\xff"));
    const std::string head = "{\"code\":\"";
    const std::vector<std::tuple<std::string, int, std::string>> cases = {
        {"search -n 0", 2, head + R"(usage","status":2,"option":"--lines","text":"--lines: '0')"},
        {"search --sinc=1h", 2, head + R"(usage","status":2,"option":"--sinc","text":"--sinc: no such)"},
        {"", 2, head + R"(usage","status":2,"text":"a command)"},
        {"search --db no.db", 3, head + "missing\",\"status\":3,\"text\":\"cannot read "},
        {"search --db text", 3, head + "damaged\",\"status\":3,"},
        {"search --table general_log", 3, head + "table\",\"status\":3,"},
        {"search --db 'q\"\xff'", 3, head + "database\",\"status\":3,\"text\":\""},
        {"search >/dev/full", 4, head + "system\",\"status\":4,"},
        {"stats forget nobody", 1, head + "note\",\"text\":\"no such device"},
    };
    for (const auto &[words, status, begin] : cases) {
        SCOPED_TRACE(words);
        const ProgramResult result = Run("--errors json " + words);
        EXPECT_EQ(result.status, status);
        EXPECT_THAT(result.err, StartsWith(begin));
        Json::Value value;
        EXPECT_TRUE(Json::Reader().parse(result.err, value));
        EXPECT_EQ(std::count(result.err.begin(), result.err.end(), '\n'), 1);
    }
    Expect("count --errors xml", 2);
}

TEST_F(Forms, OfErrorsNameWhatWasMeant) {
    const std::pair<std::string, std::string> cases[] = {
        {"serach -g x", "no command 'serach'; did you mean search?"},
        {"events cuont", "events: no command 'cuont'; did you mean count?"},
        {"db chekc --db x", "db: no command 'chekc'; did you mean check?"},
        {"search --sicne 1h", "--sicne: no such option; did you mean --since?"},
        {"count --host_is=a", "--host_is: no such option; did you mean --host-is?"},
        {"stats", "stats: which of devices, device, total, eps, forget?"},
        {"db", "db: which of info, check, "},
        {"zzz", "no command 'zzz'; commands are search, count, "},
        {"search word", "search: takes no 'word'"},
    };
    for (const auto &[words, named] : cases) {
        const ProgramResult result = Run(words);
        EXPECT_EQ(result.status, 2);
        EXPECT_THAT(result.err, HasSubstr(named)) << words;
    }
    EXPECT_THAT(Run("").err, HasSubstr("  search  ")) << "the short help";
}

} // namespace
} // namespace kelo::test
