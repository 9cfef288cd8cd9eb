// A cluster of two servers against SQLite with the same rows: every search, count and command must give the
// same.

#include <cstring>

#include "cluster/clock_check.h"
#include "kelosyslog/dbutil.h"
#include "kelosyslog/failure.h"
#include "platform/db_fixture.h"
#include "random_search.h"
#include "servers.h"
#include "support/test.h"

namespace kelo::test {
namespace {

constexpr int kRows = 6000;
constexpr int64_t kFirstSecond = 1'600'000'000;
size_t searches = 1000;

uint64_t IdOf(int64_t second, uint64_t node, uint64_t number) {
    return static_cast<uint64_t>(second) << 30 | node << 22 | number;
}

std::string TabSeparated(const std::string &text) {
    std::string escaped;
    for (const char byte : text) {
        if (byte == '\\' || byte == '\t' || byte == '\n')
            escaped += '\\';
        escaped += byte == '\t' ? 't' : byte == '\n' ? 'n' : byte;
    }
    return escaped;
}

// Texts of every kind.
std::string Message(Random &random, int number) {
    static const std::string kSpecial[] = {"it's a \\ 100% a_b\\n \\t",
                                           "tab\there",
                                           "line\nbreak\r",
                                           "grüße ÄÖÜ äöü",
                                           "KELVIN \u212A \u017F sign",
                                           "日本語 日x語",
                                           "[abc] ]x[ {y}",
                                           "\\N",
                                           "NULL",
                                           "\x01\x02\x7f",
                                           "<b>&amp;\"q\"",
                                           "\xf0\x9f\x98\x80 end",
                                           "'",
                                           "''",
                                           ""};
    if (number == 77)
        return std::string(65536 - 8, 'x') + " endmark";
    if (random.OneIn(400)) // not UTF-8
        return "broken \xff\xfe secret \xe9nd abcd " + std::to_string(number);
    std::string text = random.OneIn(10) ? random.Of(kSpecial) : "";
    for (size_t words = random.Below(6); words > 0; --words)
        text.append(random.Of(kWords)).append(random.OneIn(8) ? "" : " ");
    return text + std::to_string(random.Below(2000));
}

class World {
public:
    World() {
        CreateLogDatabase(sqlite);
        Random random(1);
        std::string inserts[2];
        std::vector<_SYSLOG_LOG_DATA_tag> logs;
        for (int i = 0; i < kRows; ++i)
            Add(random, i, logs, inserts[random.Below(2)]);
        InsertLogs(sqlite, logs);
        for (size_t server = 0; server < 2; ++server)
            servers.Run(server,
                        "INSERT INTO kelo.logs_shard (host, ip, fac, prio, llevel, tag, utcsec, tzoffset, "
                        "ldate, ltime, prog, msg, node, rcptid) FORMAT TabSeparated\n" +
                            inserts[server]);
    }

    Servers servers;
    TempRoot root;
    const std::string sqlite = root.File("logs.db");
    const std::string cluster = servers.Made("cluster.conf");
    const std::string administrator = servers.Made("cluster-admin.conf");
    std::vector<std::string> messages;

private:
    void Add(Random &random, int i, std::vector<_SYSLOG_LOG_DATA_tag> &logs, std::string &insert) {
        _SYSLOG_LOG_DATA_tag log = SampleLog(i);
        log.utcsec = kFirstSecond + i * 5 + static_cast<int>(random.Below(5));
        const uint64_t node = i % 200;
        log.id = IdOf(log.utcsec, node, static_cast<uint64_t>(i));
        log.host = "host" + std::to_string(random.Below(9));
        log.prog = "prog" + std::to_string(random.Below(4));
        log.ldate = "2020/01/0" + std::to_string(1 + i / 800);
        log.msg = Message(random, i);
        messages.push_back(log.msg);
        const char *severity = g_MappingSyslogPrior[log.prio];
        for (const std::string &field :
             {log.host, log.ip, log.fac, std::string(severity), std::string(severity), log.tag,
              std::to_string(log.utcsec), log.tzoffset, log.ldate, log.ltime, log.prog, log.msg,
              std::to_string(node)})
            insert += TabSeparated(field) + "\t";
        insert += std::to_string(i) + "\n";
        logs.push_back(log);
    }
};

World *world = nullptr;

class ClusterTest : public testing::Test {
protected:
    SyslogCapture log_;
};

struct Found {
    int status = 0;
    std::vector<std::string> rows;
};

// The first row in which they differ; "" for none.
std::string Difference(const std::vector<std::string> &found, const std::vector<std::string> &expected) {
    const auto [one, other] = std::mismatch(found.begin(), found.end(), expected.begin(), expected.end());
    const auto text = [](auto at, auto end) { return at != end ? at->substr(0, 300) : "the end"; };
    if (one == found.end() && other == expected.end())
        return "";
    return "row " + std::to_string(one - found.begin()) + " is " + text(one, found.end()) + "\ninstead of " +
           text(other, expected.end());
}

int Take(_SYSLOG_LOG_DATA_tag &log, void *found) {
    static_cast<Found *>(found)->rows.push_back(
        std::to_string(log.id) + " " + log.host + " " + log.prog + " " + std::to_string(log.prio) + " " +
        std::to_string(log.utcsec) + " " + log.fac + log.ip + log.tag + log.ldate + log.ltime + log.tzoffset +
        " " + log.msg);
    return 0;
}

Found Ask(const std::string &path, RandomSearch &search) {
    Found found;
    _SYSLOG_SQL_LIMIT_tag *limit = search.limit ? &*search.limit : nullptr;
    _SYSLOG_SQL_ORDER_tag *order = search.order ? &*search.order : nullptr;
    found.status = SyslogDBSelect(path, search.conditions, limit, order, Take, &found, false);
    // The order of equal hosts, and without an order, depends on the index that SQLite uses.
    if (order == nullptr || order->attr != SYSLOG_ATTRI_ID)
        std::sort(found.rows.begin(), found.rows.end());
    return found;
}

std::string Text(const RandomSearch &search) {
    std::string clause;
    LogSearchClauseGet(search.conditions, clause);
    return "[" + search.keyword + "] " + clause +
           (search.order ? search.order->ascending ? " asc" : " desc" : "") +
           (search.limit
                ? " limit " + std::to_string(search.limit->limit) + "+" + std::to_string(search.limit->offset)
                : "");
}

// A part of a message that is UTF-8.
std::string PartOfMessage(Random &random) {
    for (;;) {
        const std::string &text = random.Of(world->messages);
        if (text.size() > 1000 || text.empty() || text.find('\xff') != std::string::npos)
            continue;
        size_t start = random.Below(text.size());
        size_t end = std::min(start + 1 + random.Below(12), text.size());
        const auto isInside = [&](size_t at) { return at < text.size() && (text[at] & '\xc0') == '\x80'; };
        while (isInside(start))
            --start;
        while (isInside(end))
            ++end;
        return text.substr(start, end - start);
    }
}

TEST_F(ClusterTest, FindsWhatSqliteFindsInRandomSearches) {
    Random random(7);
    size_t rows = 0;
    for (size_t done = 0; done < searches; ++done) {
        RandomSearch search = MakeRandomSearch(random, [&] { return PartOfMessage(random); });
        if (search.limit && (!search.order || search.order->attr != SYSLOG_ATTRI_ID))
            search.order = _SYSLOG_SQL_ORDER_tag{random.OneIn(2) ? 1 : 0, SYSLOG_ATTRI_ID};
        search.conditions.push_back({SYSLOG_ATTRI_MSG, SYSLOG_OP_RAW, "1", {}}); // no paging by dense ids
        // A wildcard for a character, and a regex, read bytes that are not UTF-8 otherwise.
        if (search.keyword.find_first_of("/?") != std::string::npos ||
            Text(search).find('_') != std::string::npos)
            search.conditions.push_back({SYSLOG_ATTRI_MSG, SYSLOG_OP_NOT_LIKE, "broken *", {}});
        const Found found = Ask(world->cluster, search);
        const Found expected = Ask(world->sqlite, search);
        rows += expected.rows.size();
        ASSERT_EQ(found.status, expected.status) << done << ": " << Text(search) << "\n"
                                                 << SyslogFailureGet()->text;
        ASSERT_EQ(Difference(found.rows, expected.rows), "") << done << ": " << Text(search);
        if (done % 4 == 0) {
            ASSERT_EQ(SyslogDBSelectCount(world->cluster, search.conditions, nullptr, nullptr),
                      SyslogDBSelectCount(world->sqlite, search.conditions, nullptr, nullptr))
                << Text(search);
        }
    }
    EXPECT_GT(rows, searches);
}

TEST_F(ClusterTest, GivesPagesByTheNumberOfRows) {
    const std::string newestFirst = RunSql(world->sqlite, "SELECT group_concat(id) FROM (SELECT id FROM logs "
                                                          "ORDER BY id DESC LIMIT 7 OFFSET 20)");
    _SYSLOG_SQL_LIMIT_tag limit{7, 20};
    for (const bool ascending : {true, false}) {
        std::string ids;
        _SYSLOG_SQL_ORDER_tag order{ascending ? 1 : 0, SYSLOG_ATTRI_ID};
        const auto take = [](_SYSLOG_LOG_DATA_tag &log, void *ids) {
            std::string &text = *static_cast<std::string *>(ids);
            text += (text.empty() ? "" : ",") + std::to_string(log.id);
            return 0;
        };
        ASSERT_EQ(SyslogDBSelect(world->cluster, {}, &limit, &order, take, &ids, false), 0);
        EXPECT_EQ(ids.size(), newestFirst.size());
        if (!ascending) {
            EXPECT_EQ(ids, newestFirst);
        }
    }
    EXPECT_EQ(SyslogDBSelectCount(world->cluster, {}, nullptr, nullptr), kRows);
}

// Each with " --db FILE" on both.
constexpr const char *kCommands[] = {
    "search -n 50 -o json",
    "search -n 50 -o json -r",
    "search -n 50 --offset 3000 -o json",
    "search -o jsonl",
    "search -o csv -r -g secret",
    "search -n 20000 -g 100% -o jsonl",
    "search -n 20000 -g a_b -o jsonl",
    "search -n 20000 -g 'c:\\windows' -o jsonl",
    "search -n 20000 -g '[abc]' -o jsonl",
    "search -n 20000 -g grüße -o jsonl",
    "search -n 20000 -g äöü -o jsonl",
    "search -n 20000 -g '日?語' -o jsonl",
    "search -n 20000 -g 'kelvin k' -o jsonl",
    "search -n 20000 -g NULL -o jsonl",
    "search -n 20000 -g \"it's\" -o jsonl",
    "search -n 20000 -g '\"a \\\\\\\\ 100%\"' -o jsonl",
    "search -n 20000 -g '/kelvin . sign/' -o jsonl",
    "search -n 20000 -g '/KELVIN .*sign/' -o jsonl",
    "search -n 20000 -g '/[])]|x[(]/' -o jsonl",
    "search -n 20000 -g '/^line.break/' -o jsonl",
    "search -n 20000 -g '/(?s)^line.break/' -o jsonl",
    "search -n 20000 -g endmark -o jsonl",
    "search -n 20000 -g 'disk -secret -100%' -p err -o jsonl",
    "search -H 'host1*,!host12' -p err -g disk -o jsonl",
    "search -H 'h?st[1' -o jsonl",
    "search -H '!host*' -o jsonl",
    "search -H host2 --since '2020-09-13 13:00' --until '2020-09-13 18:30' -o jsonl --utc",
    "search -p '!err' -t 'prog1,prog3' -n 30 -o jsonl",
    "search -g nothinghasthisword",
    "search --since 2031-01-01",
    "count",
    "count --limit 100",
    "count -g disk -p warning",
    "count -g '/(a|b)+c/' -H host1,host2",
    "values host",
    "values prog -o json",
    "values msg -n 20 --offset 100 -o json",
    "values ldate -n 1 --offset 1",
    "values utcsec -n 5",
    "values host --counts -o json",
    "values msg --counts -n 30 --offset 3 -o json",
    "values prog -p err -g disk",
    "values ldate --counts --since '2020-09-14 02:00' --utc",
    "values utcsec --counts -n 4 -H host2 -o csv",
    "count --by severity -o json",
    "count --by host -o json",
    "count --by program -p err",
    "count --by facility -g 'disk -secret' -o csv",
    "count --by host -g nothinghasthisword -o json",
    "count --by 1h -o json",
    "count --by 7min --since '2020-09-13 13:00' --until '2020-09-13 18:30' -H host2 -o jsonl",
    "count --by 1d --utc",
    "count --buckets 20 -o json",
    "count --buckets 5 -g '/(a|b)+c/' -o csv",
    "count --by 3s",
    "search -n 9 --before-id 1717990000000000000 -o json",
    "search -n 9 --after-id 1717990000000000000 -o json",
    "search -n 9 --after-id 1717990000000000000 --oldest -p err -o json",
    "search --before-id 1717990000000000000 --since '2020-09-13 13:00' -g disk -o jsonl",
};

ProgramResult RunCommand(const std::string &command, const std::string &path) {
    return RunIn(world->root.Path(), "exec kelosyslog --root . " + command + " --db " + path);
}

TEST_F(ClusterTest, GivesTheOutputAndStatusOfSqliteInCommands) {
    for (const char *command : kCommands) {
        const ProgramResult found = RunCommand(command, world->cluster);
        const ProgramResult expected = RunCommand(command, world->sqlite);
        EXPECT_EQ(found.status, expected.status) << command << "\n" << found.err;
        EXPECT_EQ(found.out == expected.out, true) << command << "\n"
                                                   << found.out.substr(0, 500) << "\ninstead of\n"
                                                   << expected.out.substr(0, 500);
    }
    const std::string page = "report --utc --events 1 ";
    for (const std::string &path : {world->cluster, world->sqlite})
        EXPECT_EQ(RunCommand(page + fs::path(path).filename().string() + ".html", path).status, 0);
    const auto figures = [](const char *name) {
        const std::string text = ReadFile(world->root.File(name));
        const size_t start = text.find("<svg");
        return text.substr(start, text.find("<footer>") - start);
    };
    EXPECT_EQ(figures("cluster.conf.html"), figures("logs.db.html"));
}

// Sums over the records in the place of the accounting.
TEST_F(ClusterTest, SumsTheAccounting) {
    const std::map<std::string, uint64_t> devices = SyslogDBHistGet(world->cluster, 0);
    EXPECT_EQ(devices.size(), 9u);
    EXPECT_EQ(SyslogDBHistTotalGet(world->cluster), static_cast<uint64_t>(kRows));
    EXPECT_EQ(SyslogDBHistGetSingle(world->cluster, "host3"), devices.at("host3"));
    EXPECT_EQ(std::to_string(devices.at("host3")),
              RunSql(world->sqlite, "SELECT count(*) FROM logs WHERE host = 'host3'"));
    const auto samples = SyslogDBEpsGet(world->cluster, kFirstSecond + 10, kFirstSecond + 1000);
    int64_t logs = 0;
    for (const auto &[stamp, sample] : samples)
        logs += sample.eps;
    EXPECT_EQ(std::to_string(logs),
              RunSql(world->sqlite, "SELECT count(*) FROM logs WHERE utcsec BETWEEN 1600000010 "
                                    "AND 1600001000"));
    EXPECT_EQ(RunCommand("stats eps --by hour --since 2020-09-01", world->cluster).status, 0);
}

TEST_F(ClusterTest, RefusesWhatItDoesNotUnderstand) {
    const Connection connection = ConnectTo(world->cluster);
    const struct {
        const char *sql;
        const char *error;
    } cases[] = {
        {"SELECT * FROM general_log", "no such table: general_log"},
        {"SELECT * FROM system.tables", "no such table: system"},
        {"SELECT * FROM logs WHERE nothing = 'x'", "no such column: nothing"},
        {"SELECT * FROM logs WHERE node = 1", "no such column: node"},
        {"SELECT * FROM logs WHERE length(msg) > 5", "unknown function at 'length"},
        {"SELECT * FROM logs WHERE host = 5", "different kinds of values"},
        {"SELECT * FROM logs WHERE msg GLOB '[a-z]x'", "GLOB sets of several characters: '[a-z]x'"},
        {"SELECT * FROM logs LIMIT 5", "it is unknown at 'LIMIT 5'"},
        {"SELECT host FROM logs", "it is unknown at its end"},
        {"SELECT * FROM logs UNION SELECT * FROM logs", "it is unknown at 'UNION"},
        {"SELECT * FROM logs; SELECT 1", "a second statement"},
        {"SELECT * FROM logs WHERE msg = 'open", "open string"},
        {"INSERT INTO logs VALUES(1)", "it is unknown at 'INSERT"},
        {"BEGIN", "no transactions and no snapshots"},
        {"DELETE FROM logs WHERE host = 'host1'", "readonly"},
    };
    for (const auto &one : cases) {
        const Outcome outcome = Execute(connection, one.sql);
        EXPECT_EQ(outcome.status, -1) << one.sql;
        EXPECT_FALSE(outcome.hasResult) << one.sql;
        EXPECT_NE(outcome.errorCode, SQLITE_OK) << one.sql;
        EXPECT_THAT(outcome.error, HasSubstr(one.error)) << one.sql;
    }
    // Comments are hints for SQLite.
    EXPECT_EQ(Execute(connection, "SELECT COUNT(*) /* it's */ FROM logs -- x", {"COUNT(*)"}).rows[0][0],
              std::to_string(kRows));
}

TEST_F(ClusterTest, SaysWhatIsWrongWithADescription) {
    const struct {
        const char *text;
        const char *error;
    } cases[] = {
        {"[cluster]\nuser=u\n", "no line 'url='"},
        {"[cluster]\nurl=http://a:1\n", "no line 'user='"},
        {"[cluster]\nurl=ftp://a\n", "line 2: 'ftp://a'"},
        {"[cluster]\nurl=http://u:p@a\n", "lines of their own"},
        {"[cluster]\nurl=http://a\n\nurl=http://a/\n", "line 4: 'http://a' is there already"},
        {"[cluster]\nurl=http://a\nusre=u\n", "line 3: unknown key 'usre'"},
        {"[cluster]\nurl=http://a\nuser=u\nuser=v\n", "line 4: 'user=' is there already"},
        {"[cluster]\nurl\n", "line 2: 'url' has no '='"},
        {"[cluster]\nurl=http://a\nuser=u\ntimeout=0\n", "line 4: '0'"},
        {"[cluster]\nurl=http://a\nuser=u\ndatabase=a.b\n", "line 4: 'a.b'"},
        {"[cluster] \nurl=http://127.0.0.1:1\nuser=u\n",
         "no server of the cluster can be reached: http://127.0.0.1:1"},
    };
    const std::string path = world->root.File("wrong.conf");
    for (const auto &one : cases) {
        WriteFile(path, one.text);
        fs::permissions(path, fs::perms(0600));
        EXPECT_EQ(SyslogDBSelectCount(path, {}, nullptr, nullptr), -1) << one.text;
        EXPECT_THAT(SyslogFailureGet()->text, HasSubstr(one.error)) << one.text;
        EXPECT_EQ(std::string(SyslogFailureGet()->path), path);
    }
    fs::permissions(path, fs::perms(0644));
    EXPECT_EQ(ConnectTo(path), nullptr);
    EXPECT_THAT(KELOFailureGet()->text, HasSubstr("chmod 0640"));
}

TEST_F(ClusterTest, IsRefusedByCommandsThatNeedSqlite) {
    for (const char *command : {"db check", "db info", "archive --dry-run"}) {
        const ProgramResult result = RunCommand(command, world->cluster);
        EXPECT_EQ(result.status, 3) << command;
        EXPECT_THAT(result.err, HasSubstr("describes a cluster")) << command;
    }
    for (const char *command : {"receive --db ", "parse - --db "}) {
        const ProgramResult result =
            RunIn(world->root.Path(), std::string("exec kelosyslog --root . ") + command + world->cluster);
        EXPECT_NE(result.status, 0) << command;
        EXPECT_THAT(result.err, HasSubstr("describes a cluster")) << command;
    }
    EXPECT_EQ(RunCommand("count --partial", world->sqlite).status, 2);
}

TEST_F(ClusterTest, NamesTheServerThatIsAway) {
    world->servers.Kill(1);
    const ProgramResult refused = RunCommand("count", world->cluster);
    EXPECT_EQ(refused.status, 3);
    EXPECT_EQ(refused.out, "");
    EXPECT_THAT(refused.err, AllOf(HasSubstr("a part of the cluster is away"),
                                   HasSubstr(world->servers.NativeAddress(1))));
    const ProgramResult partial = RunCommand("count --partial", world->cluster);
    EXPECT_EQ(partial.status, 0);
    EXPECT_EQ(partial.out, world->servers.Run(0, "SELECT count() FROM kelo.logs_shard"));
    EXPECT_THAT(partial.err, AllOf(HasSubstr("incomplete"), HasSubstr(world->servers.NativeAddress(1))));
    EXPECT_EQ(RunCommand("delete --all --yes", world->administrator).status, 3);
    world->servers.Start(1);
    // One that gets no statement is passed over.
    std::string text = ReadFile(world->cluster);
    text.insert(text.find("url="), "url=http://127.0.0.1:1\n");
    const std::string other = world->root.File("other.conf");
    WriteFile(other, text);
    fs::permissions(other, fs::perms(0600));
    EXPECT_EQ(RunCommand("count", other).out, std::to_string(kRows) + "\n");
    EXPECT_EQ(RunCommand("count", world->cluster).out, std::to_string(kRows) + "\n");
}

TEST_F(ClusterTest, FollowsWithRecordsThatComeLate) {
    const auto insert = [](size_t server, int64_t second, const std::string &text) {
        world->servers.Run(
            server,
            "INSERT INTO kelo.logs_shard (host, utcsec, msg, node, rcptid) FORMAT TabSeparated\nnew\t" +
                std::to_string(second) + "\t" + text + "\t" + std::to_string(server) + "\t1\n");
    };
    const int64_t now = std::time(nullptr);
    insert(0, now, "old");
    ChildProgram follow(world->root.Path(),
                        "exec kelosyslog search -f -n 1 -H new --fields msg --no-header --db " +
                            world->cluster);
    ASSERT_TRUE(follow.Await([&] { return follow.Out() == "old\n"; }));
    insert(0, now + 5, "first");
    ASSERT_TRUE(follow.Await([&] { return follow.Out() == "old\nfirst\n"; }));
    insert(1, now + 2, "late");
    ASSERT_TRUE(follow.Await([&] { return follow.Out() == "old\nfirst\nlate\n"; }));
}

TEST_F(ClusterTest, IsSetUpOnlyAsItCanWork) {
    const struct {
        const char *options;
        const char *error;
    } cases[] = {
        {"--shard a --shard b,a", "'a' is there twice"},
        {"--shard a,b", "need --keeper"},
        {"--shard 'a<b'", "'a<b' is no name"},
        {"--shard a --keeper k:0", "'0' is no port"},
        {"", "no --shard"},
    };
    for (const auto &one : cases) {
        const ProgramResult result =
            RunIn(world->root.Path(), std::string("exec kelosyslog cluster init wrong ") + one.options);
        EXPECT_EQ(result.status, 2) << one.options;
        EXPECT_THAT(result.err, HasSubstr(one.error)) << one.options;
    }
    const ProgramResult again = RunIn(
        world->root.Path(), "kelosyslog cluster init r --shard a,b --keeper k --network 192.0.2.0/24 && "
                            "exec kelosyslog cluster init r --shard a");
    EXPECT_EQ(again.status, 4);
    EXPECT_THAT(ReadFile(world->root.File("r/tables.sql")),
                HasSubstr("ReplicatedReplacingMergeTree('/kelo/{shard}/logs'"));
    EXPECT_THAT(ReadFile(world->root.File("r/b/config.d/kelosyslog.xml")),
                AllOf(HasSubstr("<shard>1</shard><replica>b</replica>"),
                      HasSubstr("<host>k</host><port>2181</port>")));
}

TEST_F(ClusterTest, IsCheckedServerByServer) {
    const auto check = [] { return RunIn("/", "exec kelosyslog cluster check " + world->cluster); };
    const ProgramResult sound = check();
    EXPECT_EQ(sound.status, 0) << sound.out;
    EXPECT_THAT(sound.out, HasSubstr("2 servers: 0 errors"));
    const struct {
        const char *harm;
        const char *finding;
        const char *remedy;
    } cases[] = {
        {"RENAME TABLE kelo.logs TO kelo.away", "table logs is missing",
         "RENAME TABLE kelo.away TO kelo.logs"},
        {"ALTER TABLE kelo.logs_shard MODIFY COLUMN host FixedString(64)",
         "column host of logs_shard is FixedString(64)",
         "ALTER TABLE kelo.logs_shard MODIFY COLUMN host String"},
        {"DETACH TABLE kelo.logs_shard", "table logs_shard is missing", "ATTACH TABLE kelo.logs_shard"},
    };
    const std::string name = world->servers.Url(1).substr(7);
    for (const auto &one : cases) {
        world->servers.Run(1, one.harm);
        const ProgramResult result = check();
        world->servers.Run(1, one.remedy);
        EXPECT_EQ(result.status, 1) << one.harm;
        EXPECT_THAT(result.out, HasSubstr(name + ": error: " + one.finding)) << one.harm;
        EXPECT_THAT(result.out, HasSubstr("2 servers: 1 error,")) << one.harm;
    }
    EXPECT_THAT(RunIn("/", "exec kelosyslog cluster check " + world->administrator).out,
                HasSubstr("may do more than read"));
}

// In seconds: when it was asked, what it said, when it answered.
TEST(ClusterClocks, AreWrongOnlyIfTheyMustBe) {
    tool::ClockOffset offset;
    tool::Narrow(offset, 10.0, 12, 10.1);
    tool::Narrow(offset, 10.8, 13, 10.9);
    EXPECT_NEAR(offset.least, 2.1, 1e-9);
    EXPECT_NEAR(offset.most, 3.0, 1e-9);
    const tool::ClockOffset right{-0.2, 0.1};
    const tool::ClockOffset unknown;
    EXPECT_THAT(tool::WrongClocks({right, offset, unknown}), ElementsAre(Pair(1, testing::_)));
    EXPECT_THAT(tool::WrongClocks({offset}), ElementsAre(Pair(0, testing::_)));
    EXPECT_THAT(tool::WrongClocks({{-0.9, 0.1}, {0.4, 1.1}}), IsEmpty());
}

TEST_F(ClusterTest, ShowsWhatEachServerHolds) {
    const auto status = [](const std::string &options) {
        return RunIn("/", "exec kelosyslog cluster status " + world->cluster + options);
    };
    world->servers.Run(0,
                       "INSERT INTO kelo.logs_shard (utcsec, node, rcptid) SELECT toUnixTimestamp(now()), 7, "
                       "number FROM numbers(90)");
    const ProgramResult result = status(" -o json");
    EXPECT_EQ(result.status, 0) << result.err;
    std::string rows = world->servers.Run(1, "SELECT count() FROM kelo.logs_shard");
    rows.pop_back();
    EXPECT_THAT(result.out, AllOf(HasSubstr("\"shard\":\"2\",\"rows\":" + rows + ","),
                                  HasSubstr("{\"log_server\":7,\"rows_per_second\":1.5,")));
    world->servers.Kill(1);
    EXPECT_EQ(status("").status, 1);
    EXPECT_THAT(status("").out,
                HasSubstr("! " + world->servers.Url(1).substr(7) + " is away: Failed to connect"));
    world->servers.Start(1);
    EXPECT_EQ(RunCommand("delete --yes --since -1d", world->administrator).status, 0);
}

// The last: the rows are gone after them.
TEST_F(ClusterTest, DeletesWhatSqliteDeletes) {
    for (const char *command :
         {"delete -g disk --yes -H 'host[1-3],host1'", "delete -p err --until 2020-09-14 --yes --utc",
          "delete -g nothinghasthisword --yes", "delete -H host2 --dry-run"}) {
        const ProgramResult found = RunCommand(command, world->administrator);
        const ProgramResult expected = RunCommand(command, world->sqlite);
        EXPECT_EQ(found.status, expected.status) << command << found.err;
        EXPECT_EQ(found.out.substr(0, found.out.find(" from")),
                  expected.out.substr(0, expected.out.find(" from")));
    }
    EXPECT_EQ(RunCommand("search -H 'host*' -o jsonl", world->cluster).out ==
                  RunCommand("search -o jsonl", world->sqlite).out,
              true);
}

TEST_F(ClusterTest, RemovesOnlyWholeDaysThatAreOld) {
    const auto retention = [](const std::string &options) {
        return RunIn("/", "exec kelosyslog cluster retention " + world->administrator + " " + options);
    };
    for (const char *nonsense : {"--keep 1h --yes", "--keep 30 --yes", "--keep 9000y --yes", "--yes"})
        EXPECT_EQ(retention(nonsense).status, 2) << nonsense;
    // The time of the engine wraps around, so the first is in an old day.
    world->servers.Run(1,
                       "INSERT INTO kelo.logs_shard (host, utcsec) VALUES ('future', 5900000000), ('kept', "
                       "toUnixTimestamp(now()) - 86400), ('old', toUnixTimestamp(now()) - 4 * 86400)");
    const auto rows = [] { return world->servers.Run(1, "SELECT count() FROM kelo.logs_shard"); };
    const std::string before = rows();
    const ProgramResult dry = retention("--keep 2d --dry-run");
    EXPECT_EQ(dry.status, 0);
    EXPECT_THAT(dry.out, HasSubstr("would remove " + world->servers.Url(1).substr(7) + ": day "));
    EXPECT_EQ(rows(), before);
    world->servers.Kill(0);
    EXPECT_EQ(retention("--keep 2d --yes").status, 3);
    EXPECT_EQ(world->servers.Run(1, "SELECT host FROM kelo.logs_shard ORDER BY host"), "future\nkept\n");
    world->servers.Start(0);
    EXPECT_EQ(retention("--keep 2d --yes").status, 0);
    EXPECT_EQ(retention("--keep 2d --yes").status, 1);
}

} // namespace
} // namespace kelo::test

int main(int argc, char **argv) {
    using namespace kelo::test;
    testing::InitGoogleMock(&argc, argv);
    for (int i = 1; i + 1 < argc; ++i) {
        if (std::strcmp(argv[i], "--searches") == 0)
            searches = std::strtoul(argv[i + 1], nullptr, 10);
    }
    if (!Servers::AreInstalled()) {
        std::puts("skipped: clickhouse-server is not installed");
        return 77;
    }
    World everything;
    world = &everything;
    sharedServers = &everything.servers;
    return RUN_ALL_TESTS();
}
