#include <fstream>
#include <iomanip>
#include <random>
#include <sstream>

#include "db/killed_process.h"
#include "receive/receiver_state.h"
#include "support/program_test.h"

using namespace kelo::test;

namespace {

// A message in the spool, as the shipped configuration of syslog-ng writes it.
std::string Message(int number, const std::string &text, const std::string &level = "info") {
    const std::string host = "a host";
    return "1 0badcafe " + std::to_string(number) + " " + std::to_string(host.size()) + " 4 " +
           std::to_string(text.size()) + " 1577931072 +08:00 local0 " + level + " 86 127.0.0.1 " + host +
           " prog " + text + "\n";
}

std::string Hex(const std::string &bytes) {
    std::ostringstream text;
    for (const unsigned char byte : bytes)
        text << std::hex << std::setw(2) << std::setfill('0') << static_cast<int>(byte);
    return text.str();
}

std::string Messages(int first, int count) {
    std::string text;
    for (int number = first; number < first + count; ++number)
        text += Message(number, "message " + std::to_string(number), number % 1000 == 999 ? "err" : "info");
    return text;
}

class SpoolProgram : public ProgramTest {
protected:
    SpoolProgram() {
        fs::create_directories(files_);
        WriteFile(rules_, "[rule]\nnotify_type=\"0\"\nnotify_enable=\"1\"\nnotify_pri=\"3\"\n");
    }
    void Append(const std::string &name, const std::string &bytes) const {
        std::ofstream(files_ + name, std::ios::app | std::ios::binary) << bytes;
    }
    ChildProgram Start() const { return {root_.Path(), kProgram + kReceive}; }
    static std::string Query(const std::string &path, const std::string &sql) {
        try {
            return fs::exists(path) ? RunSql(path, sql) : "";
        } catch (const std::runtime_error &) {
            return "";
        }
    }
    std::string Rows() const {
        return Query(logs_, "SELECT count(*) || ' ' || count(DISTINCT msg) FROM logs");
    }
    std::string Counted() const {
        return Query(accounting_, "SELECT (SELECT sum(count) FROM histogram) || ' ' || sum(eps) FROM eps");
    }
    ptrdiff_t Notifications() const {
        return std::distance(fs::directory_iterator(spool_ + "new"), fs::directory_iterator());
    }
    ptrdiff_t Events() const {
        return std::stol(Query(root_.File("usr/kelo/etc/kelosyslog.db"),
                               "SELECT count(*) FROM log WHERE event GLOB 'Event detection*'"));
    }
    // All of this is stored and counted, each once.
    bool Has(int messages) const {
        const std::string number = std::to_string(messages);
        return Rows() == number + " " + number && Counted() == number + " " + number;
    }
    bool AwaitRows(ChildProgram &receiver, int messages) const {
        const std::string number = std::to_string(messages);
        return receiver.Await([&] { return Rows() == number + " " + number; });
    }
    void ExpectEnd(ChildProgram &receiver) const {
        kill(receiver.Pid(), SIGTERM);
        EXPECT_EQ(receiver.AwaitEnd().status, 0) << receiver.Err();
    }

    const std::string kReceive = "receive -v --notify-limit 1000 --spool var/spool/kelosyslog "
                                 "--db var/log/kelosyslog/logs.db";
    const std::string files_ = root_.File("var/spool/kelosyslog/files/");
};

} // namespace

TEST_F(SpoolProgram, StoresEveryByteAndSetsAsideWhatIsNoRecord) {
    const std::string hostile = std::string("a\n1 deadbeef 2 3\n\0\xff", 19) + std::string(70'000, 'x');
    const std::string torn = Message(4, "torn text");
    Append("20200102-10111", Messages(1, 2) + Message(3, hostile) + torn.substr(0, torn.size() - 4) +
                                 Messages(4, 2) + "garbage\n" + Messages(6, 1) + Messages(2, 4)); // another 3
    Append("20200102-10112", "??\n" + Messages(7, 1) + torn.substr(0, 30));
    Append("20200102-10113", "9 0badcafe what comes one day\n");
    Append("20200102-10114", torn.substr(0, torn.size() - 1));
    fs::last_write_time(files_ + "20200102-10112", fs::file_time_type::clock::now() - std::chrono::hours(1));
    ChildProgram receiver = Start();
    ASSERT_TRUE(AwaitRows(receiver, 8)) << Rows() << Counted() << receiver.Err();
    Append("20200102-10114", "\n"); // the rest of it
    ASSERT_TRUE(AwaitRows(receiver, 9)) << Rows() << Counted() << receiver.Err();
    EXPECT_EQ(RunSql(logs_, "SELECT (hex(msg) = hex(x'" + Hex(hostile) +
                                "')) ||  host||ip||fac||prio||llevel||tag||utcsec||"
                                "tzoffset||ldate||ltime||prog FROM logs WHERE id=3"),
              "1a host127.0.0.1local0infoinfo861577931072+08:002020/01/0210:11:12prog");
    ExpectEnd(receiver);
    EXPECT_THAT(receiver.Err(), HasSubstr("20200102-10113 was written for another version"));
    const std::string aside = ReadFile(root_.File("var/log/kelolog/set-aside.log"));
    EXPECT_THAT(aside, HasSubstr("\tgarbage"));
    EXPECT_THAT(aside, HasSubstr("\thalf a record in 20200102-10112 at "));
    ChildProgram again = Start(); // sets nothing aside twice
    Append("20200102-10114", Messages(9, 1));
    ASSERT_TRUE(AwaitRows(again, 10)) << Rows();
    ExpectEnd(again);
    EXPECT_TRUE(Has(10)) << Counted();
    EXPECT_EQ(ReadFile(root_.File("var/log/kelolog/set-aside.log")), aside);
    const std::string done = ReadFile(root_.File("run/kelosyslog/spool-done"));
    EXPECT_THAT(done, AllOf(HasSubstr("10111\n"), HasSubstr("10112\n"), Not(HasSubstr("10113\n")),
                            HasSubstr("10114\n")));
}

TEST_F(SpoolProgram, StoresAMessageWhenItComes) {
    ChildProgram receiver = Start();
    Append("20200102-10111", Messages(0, 1));
    ASSERT_TRUE(AwaitRows(receiver, 1));
    const auto start = std::chrono::steady_clock::now();
    for (int number = 1; number <= 10; ++number) {
        Append("20200102-10111", Messages(number, 1));
        ASSERT_TRUE(AwaitRows(receiver, number + 1));
    }
    EXPECT_LT(std::chrono::steady_clock::now() - start, std::chrono::seconds(5));
}

// Another file under the same name, then with the same inode, then one that has become shorter.
TEST_F(SpoolProgram, TellsFilesByWhatTheyAre) {
    {
        ChildProgram receiver = Start();
        Append("20200102-10111", Messages(1, 10));
        ASSERT_TRUE(AwaitRows(receiver, 10));
        fs::remove(files_ + "20200102-10111");
        Append("20200102-10111", Messages(11, 10));
        ASSERT_TRUE(AwaitRows(receiver, 20)) << Rows();
        ExpectEnd(receiver);
    }
    WriteFile(files_ + "20200102-10111", Messages(21, 20)); // keeps the inode
    ChildProgram receiver = Start();
    ASSERT_TRUE(AwaitRows(receiver, 40)) << Rows();
    WriteFile(files_ + "20200102-10111", Messages(41, 2));
    ASSERT_TRUE(AwaitRows(receiver, 42)) << Rows() << receiver.Err();
    fs::permissions(files_, fs::perms::owner_all);
    Append("20200102-10112", Messages(43, 1));
    fs::permissions(files_ + "20200102-10112", fs::perms::group_write, fs::perm_options::add);
    ASSERT_TRUE(receiver.AwaitErr("20200102-10112 is not read")) << receiver.Err();
    ExpectEnd(receiver);
    EXPECT_TRUE(Has(42));
}

// In the record of today and that of before.
TEST_F(SpoolProgram, TakesAMessageThatWasPassedOnApart) {
    const std::string texts[] = {"<134>Feb  1 10:00:00 web-1 nginx[7]: a\nb",
                                 "<134>1 2020-01-02T10:11:12Z web-1 nginx 7 - - a\nb",
                                 "no message\n1 0badcaf"};
    for (const std::string &text : texts) {
        const std::string head = std::to_string(text.size()) + " 1577931072 +08:00 ";
        const std::string record = "1 0badcafe 0  " + head + " ::ffff:10.0.0.1  " + text + "\n";
        Append("20200102-10111", "1 0badcafe 0 8 0 " + head + "user notice 0d 10.0.0.1 10.0.0.1  " + text +
                                     "\n" + record +
                                     record.substr(0, record.size() - 3)); // the last one is torn
    }
    ChildProgram receiver = Start();
    ASSERT_TRUE(receiver.Await([&] { return Query(logs_, "SELECT count(*) FROM logs") == "6"; }))
        << Rows() << receiver.Err();
    ExpectEnd(receiver);
    EXPECT_EQ(RunSql(logs_, "SELECT group_concat(count, ';') FROM (SELECT "
                            "count(*)||','||host||','||ip||','||fac||','||prio||','||tag||"
                            "','||prog||','||msg AS count FROM logs GROUP BY host, ip, fac, prio, tag, prog, "
                            "msg ORDER BY 1)"),
              "2,10.0.0.1,10.0.0.1,user,notice,0d,-,no message\n1 "
              "0badcaf;4,web-1,10.0.0.1,local0,info,86,nginx,a\nb");
}

// The clock was set back: more files than are open at a time come before one that was read in part.
TEST_F(SpoolProgram, KnowsThePlaceInAFileThatWaitsForItsTurn) {
    constexpr int kFiles = 400;
    Append("20200102-20000", Messages(0, 10));
    {
        ChildProgram receiver = Start();
        ASSERT_TRUE(AwaitRows(receiver, 10));
        ExpectEnd(receiver);
    }
    for (int number = 10; number < kFiles; ++number)
        Append("20200102-" + std::to_string(10000 + number),
               number < 300 ? Messages(number, 1) : "9 0badcafe of another version\n");
    Append("20200102-20000", Messages(300, 1));
    {
        ChildProgram receiver = Start();
        ASSERT_TRUE(receiver.Await([&] { return Rows() != "10 10"; })) << receiver.Err();
        kill(receiver.Pid(), SIGKILL);
    }
    ChildProgram receiver = Start();
    ASSERT_TRUE(AwaitRows(receiver, 301)) << Rows() << receiver.Err();
    ExpectEnd(receiver);
    EXPECT_TRUE(Has(301)) << Counted();
}

TEST_F(SpoolProgram, DoublesAndLosesNothingWhenItIsKilled) {
    std::mt19937 random(7);
    constexpr int kMessages = 60'000;
    constexpr int kKills = 12;
    int sent = 0;
    for (int kills = 0; kills < kKills; ++kills) {
        ChildProgram receiver = Start();
        ASSERT_TRUE(receiver.AwaitName("kelosyslog"));
        const auto end = std::chrono::steady_clock::now() + std::chrono::milliseconds(random() % 1500);
        while (std::chrono::steady_clock::now() < end && sent < kMessages) {
            Append("20200102-" + std::to_string(10000 + sent / 9000), Messages(sent, 100));
            sent += 100;
        }
        kill(receiver.Pid(), SIGKILL);
    }
    Append("20200102-2", Messages(sent, kMessages - sent));
    ChildProgram receiver = Start();
    EXPECT_TRUE(AwaitRows(receiver, kMessages)) << Rows() << " " << Counted() << receiver.Err();
    ExpectEnd(receiver);
    EXPECT_TRUE(Has(kMessages)) << Counted();
    EXPECT_EQ(Notifications(), kMessages / 1000);
    EXPECT_EQ(Events(), kMessages / 1000);
}

// A turn and an orderly end: SIGTERM waits for the receiver from its start. What one that was killed has left
// is for the next one. With KELO_EVERY_CALL in the environment it takes minutes.
TEST_F(SpoolProgram, DoublesAndLosesNothingAtAnyCall) {
    const std::string command =
        InFolder(root_.Path(), kProgram + kReceive + " 2>>" + root_.File("err") + " </dev/null");
    const auto run = [&command] {
        sigset_t term;
        sigemptyset(&term);
        sigaddset(&term, SIGTERM);
        sigprocmask(SIG_BLOCK, &term, nullptr);
        raise(SIGTERM);
        execl("/bin/sh", "sh", "-c", command.c_str(), nullptr);
    };
    const auto runAll = [&run] {
        for (int runs = 0; runs < 2; ++runs) {
            const pid_t process = fork();
            if (process == 0)
                run();
            int status = 0;
            waitpid(process, &status, 0);
        }
        return 0;
    };
    runAll(); // creates the databases
    int sent = 0;
    const bool isEveryCall = std::getenv("KELO_EVERY_CALL") != nullptr;
    for (int number = 1;; number += isEveryCall ? 1 : 13) {
        Append("20200102-10111",
               Messages(sent, 50) + Message(sent + 50, "an error " + std::to_string(number), "err"));
        sent += 51;
        const bool wasKilled = KillAtCall(number, Victim::kProcess, run, [] { return 0; }).has_value();
        if (wasKilled && number % 10 != 0)
            continue;
        runAll();
        ASSERT_TRUE(Has(sent)) << "killed at call " << number << " or before: " << Rows() << ", " << Counted()
                               << "\n"
                               << ReadFile(root_.File("err"));
        const ptrdiff_t errors = std::stol(Query(logs_, "SELECT count(*) FROM logs WHERE prio = 'err'"));
        ASSERT_EQ(Notifications(), errors) << "killed at call " << number;
        ASSERT_EQ(Events(), errors) << "killed at call " << number;
        if (!wasKilled)
            break;
    }
}
