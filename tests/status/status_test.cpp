// kelosyslog status over servers in every state.

#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <json/json.h>
#include <pty.h>
#include <re2/re2.h>
#include <sqlite3.h>
#include <sys/prctl.h>
#include <sys/socket.h>
#include <sys/un.h>
#include <sys/wait.h>

#include <csignal>
#include <filesystem>
#include <set>
#include <thread>

#include "base/json.h"
#include "base/text_encoding.h"
#include "base/time_format.h"
#include "status/server_status.h"
#include "status/status_json.h"
#include "status/status_screen.h"
#include "support/log_database.h"
#include "support/program_run.h"
#include "support/temp_root.h"

namespace kelo::test {
namespace {

using namespace kelo::tool;
using namespace std::chrono_literals;
namespace fs = std::filesystem;

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

// A process that looks like the receiver to others.
class FakeReceiver {
public:
    FakeReceiver() : pid_(fork()) {
        if (pid_ == 0) {
            prctl(PR_SET_PDEATHSIG, SIGKILL);
            prctl(PR_SET_NAME, "kelosyslog");
            while (true)
                pause();
        }
        const std::string comm = "/proc/" + std::to_string(pid_) + "/comm";
        while (ReadFile(comm) != "kelosyslog\n")
            std::this_thread::yield();
    }
    ~FakeReceiver() {
        kill(pid_, SIGKILL);
        waitpid(pid_, nullptr, 0);
    }
    pid_t Pid() const { return pid_; }

private:
    pid_t pid_;
};

class Status : public testing::Test {
protected:
    Status() {
        CreateLogDatabase(logs_);
        InsertSampleLogs(logs_, 3);
        CreateLogDatabase(root_.File("var/log/kelolog/.KELOACCOUNTDB"), "accinfo.sql");
        RunSql(root_.File("var/log/kelolog/.KELOACCOUNTDB"),
               "INSERT INTO eps(stamp, device, eps) VALUES (1577836800, 'a', 60), (1577836830, 'b', 60);"
               "INSERT INTO histogram(device, count) VALUES ('a', 60), ('b\x1b[7m\xff', 180)");
        CreateLogDatabase(root_.File("usr/kelo/etc/kelosyslog.db"), "kelosyslog.sql");
        RunSql(root_.File("usr/kelo/etc/kelosyslog.db"),
               "INSERT INTO log(level, time, user, event) VALUES (2, 1577836800, 'root', 'line\nfeed')");
    }
    ServerStatus Gather() const { return GatherStatus({root_.Path(), "", 200ms}); }
    void Tell(ReceiverState state) const { WriteReceiverState(root_.Path(), state); }

    struct Folders {
        explicit Folders(const TempRoot &root) {
            for (const char *name : {"var/log/kelolog/archive", "usr/kelo/etc", "etc",
                                     "var/spool/kelonotify/new", "var/spool/kelonotify/failed"})
                fs::create_directories(root.File(name));
        }
    };
    TempRoot root_;
    Folders folders_{root_};
    const std::string logs_ = root_.File("var/log/kelolog/logs.db");
    const std::string control_ = root_.File("var/lib/syslog-ng/syslog-ng.ctl");
};

TEST_F(Status, TellsWhatNeedsAttentionAndNothingElse) {
    const FakeSyslogNg syslogNg(control_, kCounters);
    const FakeReceiver receiver;
    const int64_t now = std::time(nullptr);
    EXPECT_EQ(Gather().attention, std::vector<std::string>());
    const std::string corrupt = logs_ + ".corrupt", moved = logs_ + ".moved";
    const std::string spool = root_.File("var/spool/kelonotify/");
    const std::string saved = ReadFile(logs_);
    ReceiverState state;
    state.pid = receiver.Pid();
    state.started = state.updated = now;
    ReceiverState dead = state, other = state, silent = state, waits = state, ended = state;
    dead.pid = 0x7ffffff;
    other.started = 1000; // the number was that of another process
    silent.updated = now - 120;
    waits.waiting = "the disk is full";
    ended.pid = dead.pid, ended.ended = now;
    const std::string entry =
        R"({"version":1,"id":"a","time":1,"tag":"T","channels":["mail"],"title":"","body":"","class":""})";
    const struct {
        std::function<void()> change;
        std::string named; // what the one line of attention says; "" for none
        std::function<void()> undo;
    } cases[] = {
        {[&] { Tell(state); }, "", {}},
        {[&] { Tell(ended); }, "", {}},
        {[&] { Tell(dead); }, "the receiver died: process 134217727", {}},
        {[&] { Tell(other); }, "the receiver died", {}},
        {[&] { Tell(silent); }, "told nothing of itself for 2 min", {}},
        {[&] { Tell(waits); }, "the receiver waits: the disk is full", {}},
        {[&] { WriteFile(root_.File("run/kelosyslog/receive.json"), "{"); }, "receive.json cannot be read",
         [&] { fs::remove_all(root_.File("run")); }},
        {[&] { fs::rename(logs_, moved); }, "logs.db: no such file", [&] { fs::rename(moved, logs_); }},
        {[&] { WriteFile(corrupt, "12345"); }, "logs.db.corrupt (5 B)", [&] { fs::remove(corrupt); }},
        {[&] { WriteFile(logs_, "no database" + saved); }, "database logs is damaged",
         [&] { WriteFile(logs_, saved); }},
        {[&] { WriteFile(logs_, ""); }, "the file is empty", [&] { WriteFile(logs_, saved); }},
        {[&] { WriteFile(spool + "failed/x.json", "{}"); }, "given up: 1 notification ",
         [&] { fs::remove(spool + "failed/x.json"); }},
        {[&] { WriteFile(spool + "new/a.json", entry); }, "does kelonotify run?",
         [&] { fs::remove(spool + "new/a.json"); }},
        {[&] { WriteFile(root_.File("etc/keloinfo.conf"), "smtp_mail_enabled=\"yes\"\n"); }, "smtp_server",
         [&] { fs::remove(root_.File("etc/keloinfo.conf")); }},
    };
    for (const auto &c : cases) {
        c.change();
        const std::vector<std::string> attention = Gather().attention;
        ASSERT_EQ(attention.size(), c.named.empty() ? 0U : 1U)
            << c.named << testing::PrintToString(attention);
        for (const std::string &line : attention)
            EXPECT_NE(line.find(c.named), std::string::npos) << line;
        if (c.undo)
            c.undo();
    }
    ServerStatus status = Gather();
    EXPECT_TRUE(status.attention.empty());
    status.volumes = {{{"/x"}, 1000, 100}};
    EXPECT_TRUE(FindAttention(status).empty());
    // A few messages may wait for their batch; many, or few for long, are stuck.
    status.databases.front().last = status.time - 59;
    status.syslogNg.destinations = {{"dst.sql", "d_db#0", "logs.db", 9, 4, 0, 999, 0, true}};
    EXPECT_TRUE(FindAttention(status).empty());
    status.databases.front().last = status.time - 61;
    EXPECT_EQ(FindAttention(status).at(0),
              "syslog-ng cannot write 999 messages for d_db#0 (logs.db); the newest record is 1 min old");
    status.syslogNg.destinations.front().isStuck = false;
    EXPECT_TRUE(FindAttention(status).empty());
    status.volumes.front().free = 99;
    status.syslogNg.destinations.front().dropped = 2;
    EXPECT_THAT(FindAttention(status),
                testing::ElementsAre(testing::HasSubstr("dropped 2 messages for d_db#0"),
                                     testing::HasSubstr("/x is nearly full")));
}

TEST_F(Status, WaitsNeitherForAWriterNorForALock) {
    RunSql(logs_, "INSERT INTO logs(id, utcsec) VALUES (10000000, 1600000000)");
    sqlite3 *writer = nullptr;
    ASSERT_EQ(sqlite3_open(logs_.c_str(), &writer), SQLITE_OK);
    const struct {
        const char *lock;
        DatabaseStatus::State state;
    } cases[] = {
        {"BEGIN IMMEDIATE; INSERT INTO logs(id) VALUES (10000001)", DatabaseStatus::State::Good},
        {"ROLLBACK; PRAGMA journal_mode=DELETE; BEGIN EXCLUSIVE", DatabaseStatus::State::Locked},
    };
    for (const auto &c : cases) {
        ASSERT_EQ(sqlite3_exec(writer, c.lock, nullptr, nullptr, nullptr), SQLITE_OK)
            << sqlite3_errmsg(writer);
        const auto start = std::chrono::steady_clock::now();
        const DatabaseStatus status = GatherDatabases(root_.Path(), {}).front();
        EXPECT_LT(std::chrono::steady_clock::now() - start, 3s);
        EXPECT_EQ(status.state, c.state) << status.problem;
        if (c.state == DatabaseStatus::State::Good) {
            EXPECT_TRUE(status.isEstimate);
            EXPECT_EQ(status.rows, 10000000);
            EXPECT_EQ(status.last, 1600000000);
        }
    }
    sqlite3_close(writer);
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
    const struct {
        std::string answer;
        State state;
        std::string problem;
    } cases[] = {
        {kCounters, State::Running, ""},
        {"", State::Silent, "in time"},
        {"source;s;;a;processed;7\n", State::Silent, "not complete"},
    };
    for (const auto &c : cases) {
        const FakeSyslogNg syslogNg(deep, c.answer);
        const SyslogNgStatus status = GatherSyslogNg("", deep, 200ms);
        EXPECT_EQ(status.state, c.state) << status.problem;
        EXPECT_NE(status.problem.find(c.problem), std::string::npos) << status.problem;
        EXPECT_EQ(status.pid, getpid());
        EXPECT_NEAR(static_cast<double>(status.since), static_cast<double>(std::time(nullptr)), 600);
        if (c.state == State::Running) {
            EXPECT_EQ(status.Received(), 7U);
            ASSERT_EQ(status.destinations.size(), 1U) << "the other one is orphaned";
            EXPECT_EQ(status.destinations[0].instance, "a;\"b\"");
            EXPECT_EQ(status.destinations[0].memory, 2048U);
        }
        fs::remove(deep);
    }
    EXPECT_EQ(GatherSyslogNg("", deep, 200ms).state, State::Stopped);
    const FakeSyslogNg syslogNg(deep, "dst.sql;d#0;x;a;written;4\ndst.sql;d#0;x;a;queued;3\n.\n");
    EXPECT_TRUE(GatherSyslogNg("", deep, 200ms).destinations.at(0).isStuck);
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
    state.pid = 1;
    state.incomplete["msg"] = 1;
    Tell(state);
    std::set<std::string> keys;
    CollectKeys(ParseJson(StatusJson(Gather())), "", keys);
    std::set<std::string> documented;
    const std::string page = ReadFile(KELO_SOURCE_DIR "/docs/status.md");
    re2::StringPiece rest(page);
    for (std::string key; RE2::FindAndConsume(&rest, "\n\\| `([^`]+)` \\|", &key);)
        documented.insert(key);
    EXPECT_EQ(keys, documented);
}

TEST_F(Status, FitsTheScreenWhateverTheTextsHold) {
    const FakeSyslogNg syslogNg(control_, kCounters);
    const ServerStatus status = Gather();
    ASSERT_TRUE(status.accounting);
    EXPECT_DOUBLE_EQ(status.accounting->perSecond, 2);
    const std::string whole = RenderStatus(status, {});
    const std::vector<std::string> parts = {"All is well", "7 messages received by 1 source\n", "line\\nfeed",
                                            "b\\x1b[7m\\xff   180     75.0",
                                            TimeFormat(false).Plain(1577836802)};
    for (const std::string &part : parts)
        EXPECT_NE(whole.find(part), std::string::npos) << part << " in\n" << whole;
    std::istringstream lines(RenderStatus(status, {30, 12, false}));
    size_t count = 0;
    for (std::string line; std::getline(lines, line); ++count)
        EXPECT_LE(CharacterCount(line), 30U) << line;
    EXPECT_EQ(count, 12U);
}

// Runs the program on a terminal until `seen` was seen, ends it, and returns all that it wrote and its
// status.
std::pair<std::string, int> RunOnTerminal(const std::string &root, bool byKey) {
    int terminal = -1;
    winsize size{24, 80, 0, 0};
    const pid_t pid = forkpty(&terminal, nullptr, nullptr, &size);
    if (pid == 0) {
        execl(KELOSYSLOG_PROGRAM, "kelosyslog", "status", "--watch", "60", "--root", root.c_str(), nullptr);
        _exit(127);
    }
    std::string out;
    char buffer[4096];
    for (bool isEnded = false;;) {
        const ssize_t length = read(terminal, buffer, sizeof buffer); // fails when the program is gone
        if (length <= 0)
            break;
        out.append(buffer, static_cast<size_t>(length));
        if (!isEnded && out.find("\x1b[J") != std::string::npos) {
            isEnded = true;
            if (byKey)
                WriteAll(terminal, "xq");
            else
                kill(pid, SIGTERM);
        }
    }
    int status = 0;
    waitpid(pid, &status, 0);
    close(terminal);
    return {out, WIFEXITED(status) ? WEXITSTATUS(status) : -1};
}

TEST_F(Status, WatchesOnATerminalAndLeavesItAsItWas) {
    for (const bool byKey : {true, false}) {
        const auto [out, status] = RunOnTerminal(root_.Path(), byKey);
        EXPECT_EQ(status, 1) << "no syslog-ng runs";
        EXPECT_TRUE(out.starts_with("\x1b[?1049h")) << out;
        EXPECT_TRUE(out.ends_with("\x1b[?1049l")) << out;
        EXPECT_NE(out.find("syslog-ng is not running"), std::string::npos);
    }
    const ProgramResult usage = RunTool({"status", "--watch", "0"});
    EXPECT_EQ(usage.status, 2);
    EXPECT_NE(usage.err.find("--watch: '0'"), std::string::npos) << usage.err;
}

} // namespace
} // namespace kelo::test
