// kelosyslog status over servers in every state.

#include <json/json.h>
#include <sys/socket.h>
#include <sys/un.h>

#include <thread>

#include "base/json.h"
#include "base/text_encoding.h"
#include "base/time_format.h"
#include "status/server_status.h"
#include "status/status_json.h"
#include "status/status_prometheus.h"
#include "status/status_screen.h"
#include "status/storage_folder.h"
#include "support/program_test.h"

namespace kelo::test {
namespace {

using namespace kelo::tool;
using namespace std::chrono_literals;

constexpr const char *kCounters = "SourceName;SourceId;SourceInstance;State;Type;Number\n"
                                  "source;s_lines;;a;processed;7\n"
                                  "dst.sql;d_db#0;\"a;\\\"b\\\"\";a;dropped;0\n"
                                  "dst.sql;d_db#0;\"a;\\\"b\\\"\";a;memory_usage;2048\n"
                                  "dst.file;d_gone#0;/x;o;dropped;9\n.\n";

// Listens where syslog-ng does and answers one question after the other. An empty answer means none at all.
class FakeSyslogNg {
public:
    FakeSyslogNg(const std::string &path, std::string answer) : answer_(std::move(answer)) {
        fs::create_directories(fs::path(path).parent_path());
        const fs::path before = fs::current_path(); // the path may be longer than an address
        fs::current_path(fs::path(path).parent_path());
        sockaddr_un address{AF_UNIX, "syslog-ng.ctl"};
        if (bind(socket_.Get(), reinterpret_cast<sockaddr *>(&address), sizeof address) != 0 ||
            listen(socket_.Get(), 5) != 0)
            ADD_FAILURE() << "no socket at " << path;
        fs::current_path(before);
        thread_ = std::thread([this] { Serve(); });
    }
    ~FakeSyslogNg() {
        shutdown(socket_.Get(), SHUT_RDWR);
        thread_.join();
    }

private:
    void Serve() {
        std::vector<FileHandle> open; // a connection without an answer stays open
        for (int file; (file = accept(socket_.Get(), nullptr, nullptr)) >= 0;) {
            open.emplace_back(file);
            char command[64];
            if (answer_.empty() || read(file, command, sizeof command) <= 0)
                continue;
            WriteAll(file, answer_);
            open.pop_back();
        }
    }

    FileHandle socket_{socket(AF_UNIX, SOCK_STREAM, 0)};
    std::string answer_;
    std::thread thread_;
};

class Status : public ProgramTest {
protected:
    Status() {
        CreateLogDatabase(logs_);
        InsertSampleLogs(logs_, 3);
        CreateLogDatabase(accounting_, "accinfo.sql");
        RunSql(accounting_,
               "INSERT INTO eps(stamp, device, eps) VALUES (1577836800, 'a', 60), (1577836830, 'b', 60);"
               "INSERT INTO histogram(device, count) VALUES ('a', 60), ('b\x1b[7m\xff', 180)");
        CreateLogDatabase(events_, "kelosyslog.sql");
        RunSql(events_,
               "INSERT INTO log(level, time, user, event) VALUES (2, 1577836800, 'root', 'line\nfeed')");
    }
    ServerStatus Gather() const { return GatherStatus({root_.Path(), "", 200ms}); }
    // Expects one line of attention that holds the text, or none for "".
    void ExpectAttention(const std::string &named) const {
        if (named.empty())
            EXPECT_THAT(Gather().attention, testing::IsEmpty());
        else
            EXPECT_THAT(Gather().attention, ElementsAre(HasSubstr(named)));
    }

    const std::string control_ = root_.File("var/lib/syslog-ng/syslog-ng.ctl");
};

TEST_F(Status, TellsWhatNeedsAttentionAndNothingElse) {
    const FakeSyslogNg syslogNg(control_, kCounters);
    ChildProgram receiver(root_.Path(), kProgram + std::string("parse")); // looks like one to others
    ASSERT_TRUE(receiver.AwaitName("kelosyslog"));
    ExpectAttention("");
    const int64_t now = std::time(nullptr);
    const int64_t dead = 0x7ffffff;
    const int64_t pid = receiver.Pid();
    const std::tuple<int64_t, int64_t, int64_t, int64_t, const char *, const char *> states[] = {
        {pid, now, now, 0, "", ""},
        {dead, now, now, now, "", ""},
        {dead, now, now, 0, "", "the receiver died: process 134217727"},
        {pid, 1000, now, 0, "", "the receiver died"}, // another process has its number
        {pid, now, now - 120, 0, "", "told nothing of itself for 2 min"},
        {pid, now, now, 0, "the disk is full", "the receiver waits: the disk is full"},
    };
    ReceiverState state;
    for (const auto &[process, started, updated, ended, waiting, named] : states) {
        state.pid = process, state.started = started, state.updated = updated, state.ended = ended;
        state.waiting = waiting;
        WriteReceiverState(root_.Path(), state);
        ExpectAttention(named);
    }
    const std::tuple<ReceiverState::Spool, int64_t, const char *> spools[] = {
        {{"/spool", 10, 100, 10, 59, 0}, 0, ""},
        {{"/spool", 10, 100, 10, 60, 2}, 0, "the receiver is 1 min behind; /spool is full in 45 s"},
        {{"/spool", 100, 100, 10, 0, 2}, 0, "/spool is full"},
        {{"/spool", 10, 100, 10, 0, 0}, now, "the receiver is stopped: messages wait in /spool"},
    };
    state.waiting = "";
    for (const auto &[spool, ended, named] : spools) {
        state.spool = spool, state.ended = ended, state.pid = ended != 0 ? dead : pid;
        WriteReceiverState(root_.Path(), state);
        ExpectAttention(named);
    }
    state.spool = {}, state.ended = now;
    WriteReceiverState(root_.Path(), state);
    const std::string configuration = root_.File("etc/kelosyslog/syslog-ng/kelosyslog.conf");
    const std::string unread =
        ": messages wait in " + root_.File("spool") + " (5 B); does kelosyslog-receive";
    WriteFile(root_.File("spool/files/t17"), "12345");
    WriteFile(root_.File("etc/syslog-ng/conf.d/kelosyslog.conf"), "");
    WriteFile(configuration, "@define kelo_store \"database\"\n@define kelo_spool \"/spool\"\n");
    EXPECT_THAT(Gather().attention, testing::Not(testing::Contains(HasSubstr("wait"))));
    WriteFile(configuration, "@define kelo_store \"spool\"\n@define kelo_spool \"/spool\"\n");
    EXPECT_THAT(Gather().attention, testing::Contains(StartsWith("the receiver is stopped" + unread)));
    fs::remove_all(root_.File("run/kelosyslog/receive.json"));
    EXPECT_THAT(Gather().attention, testing::Contains(StartsWith("the receiver never ran" + unread)));
    fs::remove_all(root_.File("etc/syslog-ng"));
    // A file, its content (nothing: there is no such file), and what is named then.
    const std::tuple<std::string, std::optional<std::string>, const char *> files[] = {
        {root_.File("run/kelosyslog/receive.json"), "{", "receive.json cannot be read"},
        {logs_, {}, "logs.db: no such file"},
        {logs_, "no database" + ReadFile(logs_), "database logs is damaged"},
        {logs_, "", "the file is empty"},
        {logs_ + ".corrupt", "12345", "logs.db.corrupt (5 B)"},
        {spool_ + "failed/x.json", "{}", "given up: 1 notification "},
        {spool_ + "new/a.json",
         R"({"version":1,"id":"a","time":1,"tag":"T","channels":["mail"],"title":"","body":"","class":""})",
         "does kelonotify run?"},
        {root_.File("etc/keloinfo.conf"), "smtp_mail_enabled=\"yes\"\n", "smtp_server"},
    };
    for (const auto &[file, content, named] : files) {
        const std::string before = ReadFile(file);
        fs::remove(file);
        if (content)
            WriteFile(file, *content);
        ExpectAttention(named);
        fs::remove(file);
        if (!before.empty())
            WriteFile(file, before);
    }
    ServerStatus status = Gather();
    EXPECT_THAT(status.attention, testing::IsEmpty());
    constexpr uint64_t kMiB = 1 << 20;
    status.volumes = {{{"/x"}, 1000 * kMiB, 100 * kMiB}, {{"/y"}, 100 * kMiB, 16 * kMiB}};
    EXPECT_TRUE(FindAttention(status).empty());
    // Where it listens: not, with nearly all connections in use, with datagrams that were lost.
    status.syslogNg.aboveRate = 3, status.syslogNg.refusedTls = 1;
    status.network.listeners = ConfiguredListeners({});
    status.network.listeners[0].isKnown = true;
    status.network.listeners[1].isOpen = status.network.listeners[2].isOpen = true;
    status.network.listeners[1].connections = 229, status.network.listeners[2].connections = 231;
    status.network.listeners[0].drops = 5;
    EXPECT_THAT(FindAttention(status),
                ElementsAre(HasSubstr("does not listen on UDP 127.0.0.1 port 514"), HasSubstr("5 datagrams"),
                            HasSubstr("231 connections of 256 on TCP 127.0.0.1 port 601"),
                            HasSubstr("dropped 3 messages of addresses"),
                            HasSubstr("TLS: syslog-ng refused 1 connection since")));
    status.network = {}, status.syslogNg.aboveRate = status.syslogNg.refusedTls = 0;
    // Who stores should be the only one who can write the folder, also of a link.
    fs::create_directories(root_.File("open"));
    fs::create_symlink(logs_, root_.File("open/link.db"));
    fs::permissions(root_.File("open"), fs::perms::others_write, fs::perm_options::add);
    const std::string folder = fs::path(logs_).parent_path();
    const std::tuple<std::string, fs::perms, std::string> stored[] = {
        {logs_, fs::perms::owner_all, ""},
        {logs_, fs::perms::owner_all | fs::perms::group_all, "can write " + folder},
        {root_.File("open/link.db"), fs::perms::owner_all, "can write " + root_.File("open")},
    };
    for (const auto &[path, mode, named] : stored) {
        fs::permissions(folder, mode);
        status.syslogNg.destinations = {{"dst.sql", "d_db#0", "sqlite3,,," + path + ",logs"}};
        const auto problems = FindFolderProblems(status.syslogNg, status.receiver);
        EXPECT_EQ(problems.size(), named.empty() ? 0U : 1U);
        EXPECT_THAT(problems, testing::Each(HasSubstr(named)));
    }
    // A few messages may wait for their batch; many, or few for long, are stuck.
    status.databases.front().last = status.time - 59;
    status.syslogNg.destinations = {{"dst.sql", "d_db#0", "logs.db", 9, 4, 0, 999, 0, true}};
    EXPECT_TRUE(FindAttention(status).empty());
    status.databases.front().last = status.time - 61;
    EXPECT_EQ(FindAttention(status).at(0),
              "syslog-ng cannot write 999 messages for d_db#0 (logs.db); the newest record is 1 min old");
    status.syslogNg.destinations.front().isStuck = false;
    EXPECT_TRUE(FindAttention(status).empty());
    status.volumes.front().free -= 1;
    status.volumes.back().free -= 1;
    status.syslogNg.destinations.front().dropped = 2;
    EXPECT_THAT(FindAttention(status), ElementsAre(HasSubstr("dropped 2 messages for d_db#0"),
                                                   HasSubstr("/x is nearly full: 100 MiB free"),
                                                   HasSubstr("/y is full: 16 MiB free")));
}

TEST_F(Status, WaitsNeitherForAWriterNorForALock) {
    RunSql(logs_, "INSERT INTO logs(id, utcsec) VALUES (10000000, 1600000000)");
    DatabaseLock writer(logs_, "PRAGMA journal_mode");
    writer.Run("BEGIN IMMEDIATE; INSERT INTO logs(id) VALUES (10000001)");
    const auto start = std::chrono::steady_clock::now();
    DatabaseStatus status = GatherDatabases(root_.Path(), {}).front();
    EXPECT_EQ(status.state, DatabaseStatus::State::Good) << status.problem;
    EXPECT_TRUE(status.isEstimate);
    EXPECT_EQ(status.rows, 10000000);
    EXPECT_EQ(status.last, 1600000000);
    writer.Run("ROLLBACK; PRAGMA journal_mode=DELETE; BEGIN EXCLUSIVE");
    EXPECT_EQ(GatherDatabases(root_.Path(), {}).front().state, DatabaseStatus::State::Locked);
    EXPECT_LT(std::chrono::steady_clock::now() - start, 5s);
}

TEST_F(Status, LeavesTheRowsOfAWriteAheadLogWhereTheyAre) {
    InsertLogsIntoWal(logs_, {SampleLog(3)});
    const std::string log = ReadFile(logs_ + "-wal");
    ASSERT_FALSE(log.empty());
    EXPECT_EQ(GatherDatabases(root_.Path(), {}).front().rows, 4);
    EXPECT_EQ(ReadFile(logs_ + "-wal"), log);
}

TEST_F(Status, AsksSyslogNgForItsCountersInTime) {
    using State = SyslogNgStatus::State;
    const std::string deep = root_.File(std::string(120, 'd') + "/syslog-ng.ctl");
    for (const auto &[answer, state, problem] :
         {std::tuple(kCounters, State::Running, ""),
          {"", State::Silent, "in time"},
          {"source;s;;a;processed;7\n", State::Silent, "not complete"}}) {
        fs::remove(deep);
        const FakeSyslogNg syslogNg(deep, answer);
        const SyslogNgStatus status = GatherSyslogNg("", deep, 200ms);
        EXPECT_EQ(status.state, state) << status.problem;
        EXPECT_THAT(status.problem, HasSubstr(problem));
        EXPECT_EQ(status.pid, getpid());
        EXPECT_NEAR(static_cast<double>(status.since), static_cast<double>(std::time(nullptr)), 600);
        if (state == State::Running) {
            EXPECT_EQ(status.Received(), 7U);
            ASSERT_EQ(status.destinations.size(), 1U) << "the other one is orphaned";
            EXPECT_EQ(status.destinations[0].instance, "a;\"b\"");
            EXPECT_EQ(status.destinations[0].memory, 2048U);
        }
    }
    EXPECT_EQ(GatherSyslogNg("", deep, 200ms).state, State::Stopped) << "its socket is left";
    fs::remove(deep);
    const FakeSyslogNg syslogNg(deep, "dst.sql;d#0;x;a;written;4\ndst.sql;d#0;x;a;queued;3\n.\n");
    EXPECT_TRUE(GatherSyslogNg("", deep, 200ms).destinations.at(0).isStuck);
}

// Of the lines of status.md that begin so, the texts from column `from` up to one of the bytes `ends`.
std::set<std::string> Documented(const char *begin, size_t from, const char *ends) {
    std::set<std::string> documented;
    std::istringstream page(ReadFile(SourcePath("docs/status.md")));
    for (std::string line; std::getline(page, line);) {
        if (line.starts_with(begin))
            documented.insert(line.substr(from, line.find_first_of(ends, from) - from));
    }
    return documented;
}

// The names of all values: "databases[].rows", with NAME for names that are data themselves.
void CollectKeys(const Json::Value &value, const std::string &name, std::set<std::string> &keys) {
    if (value.isArray() && !value.empty() && value[0].isObject()) {
        for (const Json::Value &item : value)
            CollectKeys(item, name + "[]", keys);
    } else if (value.isObject()) {
        const bool isData = name == "receiver.incomplete" || name == "notifications.channels";
        for (const std::string &key : value.getMemberNames())
            CollectKeys(value[key], (name.empty() ? "" : name + ".") + (isData ? "NAME" : key), keys);
    } else {
        keys.insert(name);
    }
}

TEST_F(Status, HasTheKeysThatAreDocumented) {
    const FakeSyslogNg syslogNg(control_, kCounters);
    ReceiverState state;
    state.incomplete["msg"] = state.pid = 1;
    WriteReceiverState(root_.Path(), state);
    ServerStatus status = Gather();
    status.network.listeners = ConfiguredListeners({});
    std::set<std::string> keys;
    CollectKeys(ParseJson(StatusJson(status)), "", keys);
    EXPECT_EQ(keys, Documented("| `", 3, "`"));
}

TEST_F(Status, HasTheMetricsThatAreDocumented) {
    const FakeSyslogNg syslogNg(control_, kCounters);
    WriteFile(logs_ + ".corrupt", "x");
    ReceiverState state;
    state.pid = state.started = 1;
    WriteReceiverState(root_.Path(), state);
    std::set<std::string> metrics;
    std::string name;
    ServerStatus status = Gather();
    status.network.listeners = {{true, "::", 514}, {false, "::", 514}};
    status.messageSpool.bytes = 1;
    std::istringstream text(StatusPrometheus(status));
    for (std::string line; std::getline(text, line);) {
        if (line.starts_with("# HELP ")) {
            name = line.substr(7, line.find(' ', 7) - 7);
            EXPECT_TRUE(metrics.insert(name).second) << name << " comes twice";
        } else if (!line.starts_with("# TYPE " + name + (name.ends_with("_total") ? " counter" : " gauge"))) {
            EXPECT_THAT(line, MatchesRegex(name + "(\\{[a-z]+=\".*\"\\})? [0-9.e+]+"));
        }
    }
    EXPECT_EQ(metrics, Documented("kelosyslog_", 0, " {"));
    // What is special in a label.
    EXPECT_THAT(StatusPrometheus(Gather()), HasSubstr("instance=\"a;\\\"b\\\"\"} 0\n"));
}

TEST_F(Status, FitsTheScreenWhateverTheTextsHold) {
    const FakeSyslogNg syslogNg(control_, kCounters);
    const ServerStatus status = Gather();
    ASSERT_TRUE(status.accounting);
    EXPECT_DOUBLE_EQ(status.accounting->perSecond, 2);
    const std::string whole = RenderStatus(status, {});
    EXPECT_THAT(whole, AllOf(HasSubstr("All is well"), HasSubstr("7 messages received by 1 source\n"),
                             HasSubstr("line\\nfeed"), HasSubstr("b\\x1b[7m\\xff   180     75.0"),
                             HasSubstr(TimeFormat(false).Plain(1577836802))));
    std::istringstream lines(RenderStatus(status, {30, 12, false}));
    size_t count = 0;
    for (std::string line; std::getline(lines, line); ++count)
        EXPECT_LE(CharacterCount(line), 30U) << line;
    EXPECT_EQ(count, 12U);
}

TEST_F(Status, WatchesOnATerminalAndLeavesItAsItWas) {
    for (const bool byKey : {true, false}) {
        ChildProgram terminal(root_.Path(),
                              "exec script -qec 'stty rows 24 cols 80; exec kelosyslog --root . "
                              "status --watch 60' log");
        ASSERT_TRUE(terminal.Await([&] { return terminal.Out().find("\x1b[J") != std::string::npos; }));
        const std::string pid = std::to_string(terminal.Pid());
        if (byKey)
            terminal.Send("xq");
        else
            kill(std::stoi(ReadFile("/proc/" + pid + "/task/" + pid + "/children")), SIGTERM);
        const ProgramResult result = terminal.AwaitEnd();
        EXPECT_EQ(result.status, 1) << "no syslog-ng runs";
        EXPECT_THAT(result.out, AllOf(StartsWith("\x1b[?1049h"), testing::EndsWith("\x1b[?1049l"),
                                      HasSubstr("syslog-ng is not running")));
    }
}

} // namespace
} // namespace kelo::test
