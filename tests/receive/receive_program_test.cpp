#include <fcntl.h>
#include <gmock/gmock.h>
#include <sqlite3.h>
#include <sys/resource.h>
#include <sys/wait.h>
#include <unistd.h>

#include <chrono>
#include <csignal>
#include <filesystem>
#include <functional>
#include <thread>

#include "receive/receiver_state.h"
#include "support/log_database.h"
#include "support/source_dir.h"
#include "support/temp_root.h"

using kelo::test::QueryText;
using kelo::test::ReadFile;
using kelo::tool::ReceiverState;
using testing::HasSubstr;

namespace {

const std::string kHead = "local0 info 2020/01/02 10:11:12 100 200 +08:00 nas 127.0.0.1 prog tag ";

std::string Lines(int first, int count) {
    std::string text;
    for (int number = first; number < first + count; ++number)
        text += kHead + "message " + std::to_string(number) + "\n";
    return text;
}

// The program at the end of a pipe, with everything below a root of its own.
class ReceiveProgram : public testing::Test {
protected:
    void SetUp() override {
        for (const char *folder :
             {"/usr/kelo/syslog", "/usr/kelo/etc", "/var/log/kelolog", "/etc/kelosyslog"})
            std::filesystem::create_directories(root_.Path() + folder);
        std::filesystem::create_symlink(kelo::test::SourcePath("package/schema"),
                                        root_.File("usr/kelo/syslog/schema"));
    }
    void TearDown() override {
        if (child_ > 0)
            kill(child_, SIGKILL);
        close(pipe_);
        if (HasFailure())
            ADD_FAILURE() << ReadFile(Err());
    }

    // With a limit of the size of files, in bytes, where it is not 0.
    void Start(rlim_t fileLimit = 0, const std::string &database = "logs.db") {
        int ends[2];
        ASSERT_EQ(pipe2(ends, O_CLOEXEC), 0);
        child_ = fork();
        if (child_ == 0) {
            const rlimit limit{fileLimit, RLIM_INFINITY};
            if (dup2(ends[0], STDIN_FILENO) == 0 && freopen(Err().c_str(), "w", stderr) != nullptr &&
                (fileLimit == 0 || setrlimit(RLIMIT_FSIZE, &limit) == 0))
                execl(KELO_PROGRAM, KELO_PROGRAM, "receive", "-v", "--root", root_.Path().c_str(), "--db",
                      root_.File(database).c_str(), "--notify-limit", "3", nullptr);
            _exit(127);
        }
        close(ends[0]);
        pipe_ = ends[1];
    }
    void Send(const std::string &text) {
        ASSERT_EQ(write(pipe_, text.data(), text.size()), static_cast<ssize_t>(text.size()));
    }
    // Its exit status, -1 for another end.
    int AwaitEnd() {
        int status = 0;
        const bool isEnded = Await([&] { return waitpid(child_, &status, WNOHANG) == child_; });
        child_ = isEnded ? -1 : child_;
        return isEnded && WIFEXITED(status) ? WEXITSTATUS(status) : -1;
    }
    int End() {
        close(pipe_);
        return AwaitEnd();
    }
    static bool Await(const std::function<bool()> &isReached) {
        const auto deadline = std::chrono::steady_clock::now() + std::chrono::seconds(40);
        while (!isReached()) {
            if (std::chrono::steady_clock::now() > deadline)
                return false;
            std::this_thread::sleep_for(std::chrono::milliseconds(20));
        }
        return true;
    }
    bool AwaitRows(int rows) {
        return Await([&] { return Rows() == std::to_string(rows); });
    }
    bool AwaitErr(const std::string &text) {
        return Await([&] { return ReadFile(Err()).find(text) != std::string::npos; });
    }
    // "N" when the database holds messages 0 to N-1, each once.
    std::string Rows(const std::string &name = "logs.db") const {
        if (!std::filesystem::exists(root_.File(name)))
            return "";
        try {
            return QueryText(root_.File(name),
                             "SELECT count(DISTINCT msg)||iif(count(*)=count(DISTINCT msg),'','!') "
                             "FROM logs");
        } catch (const std::runtime_error &) { // has no table yet
            return "";
        }
    }
    std::string Counted() const {
        return QueryText(root_.File("var/log/kelolog/.KELOACCOUNTDB"), "SELECT sum(count) FROM histogram");
    }
    std::string Events(const std::string &pattern) const {
        return QueryText(root_.File("usr/kelo/etc/kelosyslog.db"),
                         "SELECT count(*) FROM log WHERE event GLOB '" + pattern + "'");
    }
    ptrdiff_t Notifications(const std::string &tag) const {
        ptrdiff_t count = 0;
        const std::string folder = root_.File("var/spool/kelonotify/new");
        if (std::filesystem::exists(folder))
            for (const auto &entry : std::filesystem::directory_iterator(folder))
                count += ReadFile(entry.path()).find("\"" + tag + "\"") != std::string::npos ? 1 : 0;
        return count;
    }
    ReceiverState State() const {
        return kelo::tool::ReadReceiverState(root_.Path()).value_or(ReceiverState{});
    }
    std::string Err() const { return root_.File("err"); }

    kelo::test::TempRoot root_;
    pid_t child_ = -1;
    int pipe_ = -1;
};

} // namespace

TEST_F(ReceiveProgram, StoresCountsAndSetsAside) {
    Start();
    Send(Lines(0, 3000) + "\n" + kHead + "\nshort line\n" + std::string(17 << 20, 'x') + "\n" + kHead +
         std::string("\xff'%s\\\0\t\n", 8));
    for (int i = 0; i < 500; ++i)
        Send("bad\n");
    Send(Lines(3000, 2999) + kHead + "no line feed at the end");
    EXPECT_EQ(End(), 0);
    EXPECT_EQ(Rows(), "6001");
    EXPECT_EQ(Counted(), "6001");
    EXPECT_EQ(QueryText(root_.File("logs.db"), "SELECT hex(msg) FROM logs WHERE id=3001"), "FF2725735C0009");
    const ReceiverState state = State();
    EXPECT_EQ(state.received, 6001U);
    EXPECT_EQ(state.stored, 6001U);
    EXPECT_EQ(state.incomplete.at("msg"), 1U);
    EXPECT_EQ(state.rejected, 501U);
    EXPECT_EQ(state.overlong, 1U);
    EXPECT_GT(state.ended, 0);
    const std::string aside = ReadFile(root_.File("var/log/kelolog/set-aside.log"));
    EXPECT_THAT(aside, HasSubstr("\tincomplete: msg is empty\t" + kHead + "\n"));
    EXPECT_THAT(aside, HasSubstr("\trejected: 2 of 11 fields\tshort line\n"));
    EXPECT_THAT(aside, HasSubstr("\trejected: too long\txxx"));
    EXPECT_EQ(std::count(aside.begin(), aside.end(), '\n'), 503);
    const std::string err = ReadFile(Err());
    EXPECT_LT(std::count(err.begin(), err.end(), '\n'), 12) << err;
    EXPECT_EQ(Events("Server was st?*ed ?kelosyslog receive?."), "2");
}

TEST_F(ReceiveProgram, LoadsChangedRulesAndBoundsAFlood) {
    const std::string flood(
        R"(local0 err 2020/01/02 10:11:12 100 200 +08:00 nas 127.0.0.1 prog tag disk "broken")");
    Start();
    Send(flood + "\n");
    ASSERT_TRUE(AwaitRows(1));
    kelo::test::WriteFile(root_.File("etc/kelosyslog/notify.conf"),
                          "[worse]\nnotify_type=\"0\"\nnotify_pri=\"3\"\nnotify_enable=\"1\"\n");
    kill(child_, SIGHUP);
    ASSERT_TRUE(AwaitErr("rules loaded anew"));
    for (int i = 0; i < 50; ++i)
        Send(flood + std::to_string(i) + (i == 0 ? std::string(5000, '"') : "") + "\n");
    ASSERT_TRUE(AwaitRows(51));
    EXPECT_EQ(Notifications("KELOSYSLOG_SEV_EXCEED"), 3);
    kill(child_, SIGTERM); // and the pipe stays open
    EXPECT_EQ(AwaitEnd(), 0);
    EXPECT_EQ(Notifications("KELOSYSLOG_SEV_EXCEED"), 4);
    EXPECT_EQ(Events("*severity is ?err?. Log content: ?disk*"), "3");
    EXPECT_EQ(Events("*Log content: ?47 more *"), "1");
    EXPECT_EQ(State().suppressed, 47U);
    EXPECT_EQ(Counted(), "51");
}

TEST_F(ReceiveProgram, WaitsForALockedDatabase) {
    Start();
    Send(Lines(0, 10));
    ASSERT_TRUE(AwaitRows(10));
    sqlite3 *locker = nullptr;
    sqlite3_open(root_.File("logs.db").c_str(), &locker);
    ASSERT_EQ(sqlite3_exec(locker, "BEGIN IMMEDIATE", nullptr, nullptr, nullptr), SQLITE_OK);
    Send(Lines(10, 10));
    ASSERT_TRUE(Await([&] { return !State().waiting.empty(); }));
    Send(Lines(20, 500)); // stays in the pipe
    sqlite3_close(locker);
    ASSERT_TRUE(AwaitRows(520));
    ASSERT_TRUE(Await([&] { return State().waiting.empty(); }));
    const std::string err = ReadFile(Err());
    EXPECT_EQ(err.find("receiving waits"), err.rfind("receiving waits")) << err;
    EXPECT_EQ(End(), 0);
}

TEST_F(ReceiveProgram, WaitsForRoomOnAFullDisk) {
    Start(256 * 1024);
    std::thread sender([this] { Send(Lines(0, 20000)); });
    ASSERT_TRUE(AwaitErr("receiving waits"));
    const rlimit limit{RLIM_INFINITY, RLIM_INFINITY};
    EXPECT_EQ(prlimit(child_, RLIMIT_FSIZE, &limit, nullptr), 0);
    sender.join();
    EXPECT_TRUE(AwaitRows(20000)) << Rows();
    EXPECT_EQ(End(), 0);
    EXPECT_EQ(Events("Volume space is not enough."), "1");
    EXPECT_EQ(Notifications("KELOSYSLOG_VOL_FULL"), 1);
    EXPECT_EQ(Counted(), "20000");
}

// A full disk leaves databases behind that have no table.
TEST_F(ReceiveProgram, CompletesEmptyDatabases) {
    for (const char *file : {"var/log/kelolog/.KELOACCOUNTDB", "usr/kelo/etc/kelosyslog.db"})
        close(open(root_.File(file).c_str(), O_CREAT | O_WRONLY | O_CLOEXEC, 0640));
    Start();
    Send(Lines(0, 10));
    EXPECT_EQ(End(), 0);
    EXPECT_EQ(Counted(), "10");
    EXPECT_EQ(Events("Server was started*"), "1");
}

// Each event that is tried would hold up what is received for seconds.
TEST_F(ReceiveProgram, TriesALockedEventLogOnce) {
    kelo::test::WriteFile(root_.File("etc/kelosyslog/notify.conf"),
                          "[all]\nnotify_type=\"0\"\nnotify_pri=\"6\"\nnotify_enable=\"1\"\n");
    Start();
    ASSERT_TRUE(Await([&] { return State().pid == child_; }));
    sqlite3 *locker = nullptr;
    sqlite3_open(root_.File("usr/kelo/etc/kelosyslog.db").c_str(), &locker);
    ASSERT_EQ(sqlite3_exec(locker, "BEGIN IMMEDIATE", nullptr, nullptr, nullptr), SQLITE_OK);
    Send(Lines(0, 10));
    EXPECT_TRUE(AwaitRows(10));
    sqlite3_close(locker);
    EXPECT_EQ(Notifications("KELOSYSLOG_SEV_EXCEED"), 3);
    const std::string err = ReadFile(Err());
    EXPECT_EQ(err.find("Fail to add log"), err.rfind("Fail to add log")) << err;
    EXPECT_EQ(End(), 0);
}

TEST_F(ReceiveProgram, GoesOnInAFreshDatabase) {
    Start();
    Send(Lines(0, 10));
    ASSERT_TRUE(AwaitRows(10));
    std::filesystem::rename(root_.File("logs.db"), root_.File("moved.db"));
    Send(Lines(0, 20));
    ASSERT_TRUE(AwaitRows(20));
    EXPECT_EQ(Rows("moved.db"), "10") << "what stood in the write-ahead log";

    kill(child_, SIGHUP); // closes the database, so that the damage is read
    ASSERT_TRUE(AwaitErr("rules loaded anew"));
    const int file = open(root_.File("logs.db").c_str(), O_WRONLY | O_CLOEXEC);
    EXPECT_EQ(pwrite(file, std::string(100, '\xff').data(), 100, 100), 100);
    close(file);
    Send(Lines(0, 30));
    ASSERT_TRUE(AwaitRows(30));
    EXPECT_TRUE(std::filesystem::exists(root_.File("logs.db.corrupt")));
    EXPECT_EQ(Notifications("KELOSYSLOG_DB_CORRUPT"), 1);
    EXPECT_EQ(End(), 0);
}
