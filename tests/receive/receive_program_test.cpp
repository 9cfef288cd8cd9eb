#include <sys/resource.h>

#include <thread>

#include "receive/receiver_state.h"
#include "support/program_test.h"

using namespace kelo::test;
using kelo::tool::ReceiverState;

namespace {

class ReceiveProgram : public ProgramTest {
protected:
    // The receiver, after the shell's commands in `before`.
    ChildProgram Start(const std::string &before = "") const {
        return {root_.Path(),
                before + kProgram + "receive -v --db var/log/kelosyslog/logs.db --notify-limit 3"};
    }
    // Empty while the database is missing or has no table yet.
    static std::string Query(const std::string &path, const char *sql) {
        try {
            return fs::exists(path) ? RunSql(path, sql) : "";
        } catch (const std::runtime_error &) {
            return "";
        }
    }
    // "N" when the database holds messages 0 to N-1, each once.
    static std::string Rows(const std::string &path) {
        return Query(path, "SELECT count(DISTINCT msg)||iif(count(*)=count(DISTINCT msg),'','!') FROM logs");
    }
    bool AwaitRows(ChildProgram &receiver, int rows) const {
        return receiver.Await([&] { return Rows(logs_) == std::to_string(rows); });
    }
    std::string Counted() const { return Query(accounting_, "SELECT sum(count) FROM histogram"); }
    std::string Events(const std::string &pattern) const {
        return RunSql(events_, "SELECT count(*) FROM log WHERE event GLOB '" + pattern + "'");
    }
    ptrdiff_t Notifications(const std::string &tag) const {
        ptrdiff_t count = 0;
        for (const auto &entry : fs::directory_iterator(spool_ + "new"))
            count += ReadFile(entry.path()).find("\"" + tag + "\"") != std::string::npos ? 1 : 0;
        return count;
    }
    ReceiverState State() const {
        return kelo::tool::ReadReceiverState(root_.Path()).value_or(ReceiverState{});
    }
    void WriteRule(int leastSeverity) const {
        WriteFile(rules_, "[rule]\nnotify_type=\"0\"\nnotify_enable=\"1\"\nnotify_pri=\"" +
                              std::to_string(leastSeverity) + "\"\n");
    }
};

} // namespace

TEST_F(ReceiveProgram, HasTheIndexExtendedOnItsBeat) {
    ChildProgram receiver = Start();
    receiver.Send(LogLines(0, 40'000));
    const auto covered = [&] {
        return ReadFile(logs_ + "-skip").size() > 500'000; // two pieces
    };
    EXPECT_TRUE(receiver.Await(covered));
    EXPECT_EQ(receiver.End().status, 0);
}

TEST_F(ReceiveProgram, StoresCountsAndSetsAside) {
    ChildProgram receiver = Start();
    receiver.Send(LogLines(0, 3000) + "\n" + kLogHead + "\nshort line\n" + std::string(17 << 20, 'x') + "\n" +
                  kLogHead + std::string("\xff'%s\\\0\t\n", 8));
    for (int i = 0; i < 500; ++i)
        receiver.Send("bad\n");
    receiver.Send(LogLines(3000, 2999) + kLogHead + "no line feed at the end");
    EXPECT_EQ(receiver.End().status, 0);
    EXPECT_EQ(Rows(logs_), "6001");
    EXPECT_EQ(Counted(), "6001");
    EXPECT_EQ(RunSql(logs_, "SELECT hex(msg) FROM logs WHERE id=3001"), "FF2725735C0009");
    const ReceiverState state = State();
    EXPECT_EQ(state.received, 6001U);
    EXPECT_EQ(state.stored, 6001U);
    EXPECT_EQ(state.incomplete.at("msg"), 1U);
    EXPECT_EQ(state.rejected, 501U);
    EXPECT_EQ(state.overlong, 1U);
    EXPECT_GT(state.ended, 0);
    const std::string aside = ReadFile(root_.File("var/log/kelolog/set-aside.log"));
    EXPECT_THAT(aside, HasSubstr("\tincomplete: msg is empty\t" + kLogHead + "\n"));
    EXPECT_THAT(aside, HasSubstr("\trejected: 2 of 11 fields\tshort line\n"));
    EXPECT_THAT(aside, HasSubstr("\trejected: too long\txxx"));
    EXPECT_EQ(std::count(aside.begin(), aside.end(), '\n'), 503);
    const std::string err = receiver.Err();
    EXPECT_LT(std::count(err.begin(), err.end(), '\n'), 12) << err;
    EXPECT_EQ(Events("Server was st?*ed ?kelosyslog receive?."), "2");
}

TEST_F(ReceiveProgram, LoadsChangedRulesAndBoundsAFlood) {
    const std::string flood(
        R"(local0 err 2020/01/02 10:11:12 100 200 +08:00 nas 127.0.0.1 prog tag disk "broken")");
    ChildProgram receiver = Start();
    receiver.Send(flood + "\n");
    ASSERT_TRUE(AwaitRows(receiver, 1));
    WriteRule(3);
    kill(receiver.Pid(), SIGHUP);
    ASSERT_TRUE(receiver.AwaitErr("rules loaded anew"));
    for (int i = 0; i < 50; ++i)
        receiver.Send(flood + std::to_string(i) + (i == 0 ? std::string(5000, '"') : "") + "\n");
    ASSERT_TRUE(AwaitRows(receiver, 51));
    EXPECT_EQ(Notifications("KELOSYSLOG_SEV_EXCEED"), 3);
    kill(receiver.Pid(), SIGTERM); // and the pipe stays open
    EXPECT_EQ(receiver.AwaitEnd().status, 0);
    EXPECT_EQ(Notifications("KELOSYSLOG_SEV_EXCEED"), 4);
    EXPECT_EQ(Events("*severity is ?err?. Log content: ?disk*"), "3");
    EXPECT_EQ(Events("*Log content: ?47 more *"), "1");
    EXPECT_EQ(State().suppressed, 47U);
    EXPECT_EQ(Counted(), "51");
}

TEST_F(ReceiveProgram, CountsSoManyNamesUntilSomeAreForgotten) {
    ChildProgram receiver(root_.Path(), std::string(kProgram) + "receive -v --device-limit 3");
    const auto send = [&receiver](const std::string &host) {
        receiver.Send("local0 info 2020/01/02 10:11:12 100 200 +08:00 " + host +
                      " 127.0.0.1 prog tag text\n");
    };
    const auto awaitDevices = [&](const std::string &devices) {
        return receiver.Await([&] {
            return Query(accounting_, "SELECT group_concat(device || count, ' ') FROM "
                                      "(SELECT * FROM histogram ORDER BY device)") == devices;
        });
    };
    const std::string longName = std::string(254, 'z') + "\xc3\xbc" + "z";
    for (const std::string &host :
         std::vector<std::string>{"a[1", "a[2", longName, longName + "z", "b", "c", "a[1"})
        send(host);
    EXPECT_TRUE(awaitDevices("(others)2 a[12 a[21 " + std::string(254, 'z') + "2"));
    EXPECT_TRUE(receiver.Await([&] { return State().others == 2; }));
    EXPECT_EQ(Events("Records of more than 3 devices were received*"), "1");
    EXPECT_THAT(Run("stats forget 'a[[]*' -y").err, HasSubstr("no such device"));
    EXPECT_EQ(Run("stats forget 'a[*' --below 2 --yes").out, "forgot 1 device in " + accounting_ + "\n");
    ASSERT_TRUE(receiver.AwaitErr("rules loaded anew"));
    EXPECT_TRUE(receiver.Await([&] { return Query(accounting_, "SELECT count(*) FROM forgotten") == "0"; }));
    send("b");
    send("c");
    EXPECT_TRUE(awaitDevices("(others)3 a[12 b1 " + std::string(254, 'z') + "2"));
    EXPECT_EQ(receiver.End().status, 0);
    EXPECT_EQ(Counted(), "8");
}

TEST_F(ReceiveProgram, KeepsNotificationsUntilTheSpoolTakesThem) {
    WriteRule(7);
    fs::rename(spool_ + "new", spool_ + "away");
    WriteFile(spool_ + "new", "");
    ChildProgram receiver = Start();
    receiver.Send(LogLines(0, 2));
    ASSERT_TRUE(receiver.AwaitErr("into the spool"));
    fs::remove(spool_ + "new");
    fs::rename(spool_ + "away", spool_ + "new");
    EXPECT_TRUE(receiver.Await([&] { return Notifications("KELOSYSLOG_SEV_EXCEED") == 2; }));
    fs::remove_all(spool_ + "new");
    WriteFile(spool_ + "new", "");
    receiver.Send(LogLines(2, 1));
    EXPECT_EQ(receiver.End().status, 0);
    EXPECT_EQ(State().lostNotifications, 1U);
}

TEST_F(ReceiveProgram, WaitsForRoomOnAFullDisk) {
    ChildProgram receiver = Start("ulimit -S -f 512; ");
    std::thread sender([&] { receiver.Send(LogLines(0, 20000)); });
    ASSERT_TRUE(receiver.AwaitErr("receiving waits"));
    const rlimit limit{RLIM_INFINITY, RLIM_INFINITY};
    EXPECT_EQ(prlimit(receiver.Pid(), RLIMIT_FSIZE, &limit, nullptr), 0);
    sender.join();
    EXPECT_TRUE(AwaitRows(receiver, 20000)) << Rows(logs_);
    EXPECT_EQ(receiver.End().status, 0);
    EXPECT_EQ(Events("Volume space is not enough."), "1");
    EXPECT_EQ(Notifications("KELOSYSLOG_VOL_FULL"), 1);
    EXPECT_EQ(Counted(), "20000");
}

// A full disk leaves databases behind that have no table.
TEST_F(ReceiveProgram, CompletesEmptyDatabases) {
    WriteFile(accounting_, "");
    WriteFile(events_, "");
    ChildProgram receiver = Start();
    receiver.Send(LogLines(0, 10));
    EXPECT_EQ(receiver.End().status, 0);
    EXPECT_EQ(Counted(), "10");
    EXPECT_EQ(Events("Server was started*"), "1");
}

// A view can give rows without end.
TEST_F(ReceiveProgram, PutsAsideAnAccountingWithViewsForTables) {
    RunSql(
        accounting_,
        "CREATE TABLE eps (id INTEGER PRIMARY KEY, stamp, device, eps); CREATE VIEW histogram AS WITH n(i) "
        "AS (SELECT 1 UNION ALL SELECT i + 1 FROM n) SELECT i AS id, i AS device, i AS count FROM n");
    EXPECT_THAT(Run("status").out, HasSubstr("'histogram' in it is no table"));
    ChildProgram receiver = Start();
    receiver.Send(LogLines(0, 10));
    EXPECT_EQ(receiver.End().status, 0);
    EXPECT_EQ(Counted(), "10");
    EXPECT_TRUE(fs::exists(accounting_ + ".corrupt"));
}

// Each event that is tried would hold up what is received for seconds.
TEST_F(ReceiveProgram, TriesALockedEventLogOnce) {
    WriteRule(6);
    ChildProgram receiver = Start();
    ASSERT_TRUE(receiver.Await([&] { return State().pid == receiver.Pid(); }));
    {
        const DatabaseLock lock(events_);
        receiver.Send(LogLines(0, 10));
        EXPECT_TRUE(AwaitRows(receiver, 10));
    }
    EXPECT_TRUE(receiver.Await([&] { return Counted() == "10"; })) << "flushed after a rest";
    EXPECT_EQ(Notifications("KELOSYSLOG_SEV_EXCEED"), 3);
    const std::string err = receiver.Err();
    EXPECT_EQ(err.find("Fail to add log"), err.rfind("Fail to add log")) << err;
    EXPECT_EQ(receiver.End().status, 0);
}

TEST_F(ReceiveProgram, GoesOnInAFreshDatabase) {
    ChildProgram receiver = Start();
    receiver.Send(LogLines(0, 10));
    ASSERT_TRUE(AwaitRows(receiver, 10));
    fs::rename(logs_, root_.File("moved.db"));
    receiver.Send(LogLines(0, 20));
    ASSERT_TRUE(AwaitRows(receiver, 20));
    EXPECT_EQ(Rows(root_.File("moved.db")), "10") << "what stood in the write-ahead log";

    kill(receiver.Pid(), SIGHUP); // closes the database, so that the damage is read
    ASSERT_TRUE(receiver.AwaitErr("rules loaded anew"));
    const int file = open(logs_.c_str(), O_WRONLY | O_CLOEXEC);
    EXPECT_EQ(pwrite(file, std::string(100, '\xff').data(), 100, 100), 100);
    close(file);
    receiver.Send(LogLines(0, 30));
    ASSERT_TRUE(AwaitRows(receiver, 30));
    EXPECT_TRUE(fs::exists(logs_ + ".corrupt"));
    EXPECT_EQ(Notifications("KELOSYSLOG_DB_CORRUPT"), 1);
    EXPECT_EQ(receiver.End().status, 0);
}
