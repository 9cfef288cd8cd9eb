#include <sstream>

#include "db/killed_process.h"
#include "receive/receiver_state.h"
#include "support/program_test.h"
#include "support/source_dir.h"

using namespace kelo::test;

namespace {

constexpr int kMessages = 5; // in the buffer, which syslog-ng was killed with

class BufferRecovery : public ProgramTest {
protected:
    BufferRecovery() {
        fs::create_directories(files_);
        fs::create_directories(root_.File("taken"));
        WriteFile(rules_, "[rule]\nnotify_type=\"0\"\nnotify_enable=\"1\"\nnotify_pri=\"3\"\n");
        fs::copy_file(SourcePath("tests/receive/waiting.rqf"), buffer_);
    }
    ProgramResult Recover(const std::string &words = "database") const {
        return RunIn(root_.Path(), "exec recover-buffer " + words + " waiting.rqf var/spool/kelosyslog");
    }
    static ptrdiff_t Count(const std::string &folder) {
        return std::distance(fs::directory_iterator(folder), fs::directory_iterator());
    }
    // Receives until the rows are there, and to the end.
    void Receive(int rows) const {
        ChildProgram receiver(root_.Path(),
                              kProgram + std::string("receive --spool var/spool/kelosyslog --db ") + logs_);
        EXPECT_TRUE(receiver.Await([&] {
            const auto state = kelo::tool::ReadReceiverState(root_.Path());
            return state && state->pid == receiver.Pid() && state->ended == 0 && fs::exists(logs_) &&
                   RunSql(logs_, "SELECT count(*) FROM logs") == std::to_string(rows);
        })) << receiver.Err();
        kill(receiver.Pid(), SIGTERM);
        EXPECT_EQ(receiver.AwaitEnd().status, 0);
    }
    std::string Counted() const {
        return fs::exists(accounting_) ? RunSql(accounting_, "SELECT ifnull(sum(count), 0) FROM histogram")
                                       : "0";
    }

    const std::string files_ = root_.File("var/spool/kelosyslog/files/");
    const std::string buffer_ = root_.File("waiting.rqf");
};

} // namespace

// What is taken out of the spool in between, as the receiver and keep-spool do, must not come again.
TEST_F(BufferRecovery, HandsOverOnceWhereverItIsKilled) {
    const std::string command =
        InFolder(root_.Path(), "exec recover-buffer receiver waiting.rqf var/spool/kelosyslog >/dev/null");
    const auto run = [&command] { execl("/bin/sh", "sh", "-c", command.c_str(), nullptr); };
    int number = 1;
    for (;; ++number) {
        const bool wasKilled = KillAtCall(number, Victim::kAll, run, [] { return 0; }).has_value();
        for (const auto &entry : fs::directory_iterator(files_))
            fs::rename(entry.path(), root_.File("taken/" + entry.path().filename().string()));
        const ProgramResult again = Recover("receiver");
        ASSERT_EQ(again.status, 0) << number << again.err;
        ASSERT_EQ(Count(files_) + Count(root_.File("taken")), 1) << "killed at call " << number;
        ASSERT_EQ(Count(root_.File("var/spool/kelosyslog")), 1) << "killed at call " << number;
        ASSERT_FALSE(fs::exists(buffer_));
        if (!wasKilled)
            break;
        fs::remove_all(root_.File("taken"));
        fs::create_directories(root_.File("taken"));
        for (const auto &entry : fs::directory_iterator(files_))
            fs::remove(entry.path());
        fs::rename(buffer_ + ".done", buffer_);
    }
    EXPECT_GT(number, 12);
}

TEST_F(BufferRecovery, GivesTheRowsThatSqlWouldHaveWritten) {
    ASSERT_EQ(Recover().status, 0);
    // Those for sql() are counted and checked already; also when keep-spool has moved the file aside.
    Receive(kMessages);
    EXPECT_EQ(RunSql(logs_,
                     "SELECT group_concat(host || '|' || ip || '|' || fac || '|' || prio || '|' || tag || "
                     "'|' || prog || '|' || "
                     "substr(msg, 1, 30) || '|' || length(CAST(msg AS BLOB)), x'0a') FROM logs WHERE llevel "
                     "= prio AND "
                     "utcsec = 1795330489 AND ldate || ltime || tzoffset = '2026/11/2206:54:49+00:00'"),
              "nas|127.0.0.1|user|err|0b|smartd|disk broken|11\n"
              "web1|127.0.0.1|user|info|0e|app|two\nlines and \xff\\x00 % 日本語|31\n"
              "127.0.0.1|127.0.0.1|user|debug|0f|-||0\n"
              "h|127.0.0.1|user|notice|0d|sshd|1 0badcafe 0 1 1 1 as in a spo|32\n"
              "h|127.0.0.1|user|info|0e|long|" +
                  std::string(30, 'x') + "|3000");
    const fs::path file = fs::directory_iterator(files_)->path();
    fs::rename(file, files_ + ".done-1" + file.extension().string());
    Receive(kMessages);
    EXPECT_EQ(Counted(), "0");
    EXPECT_EQ(Count(spool_ + "new"), 0);
    // Those for the receiver are not.
    fs::rename(buffer_ + ".done", buffer_);
    ASSERT_EQ(Recover("receiver").status, 0);
    Receive(2 * kMessages);
    EXPECT_EQ(Counted(), std::to_string(kMessages));
    EXPECT_EQ(Count(spool_ + "new"), 1);
}

TEST_F(BufferRecovery, RefusesWhatItCannotHandOver) {
    const auto refusal = [this](const std::string &words = "database") {
        const ProgramResult result = Recover(words);
        EXPECT_EQ(result.out, "");
        EXPECT_EQ(Count(root_.File("var/spool/kelosyslog")) + Count(files_), 1);
        return std::to_string(result.status) + " " + result.err;
    };
    EXPECT_THAT(refusal("sql"), StartsWith("2 usage: recover-buffer database|receiver "));
    {
        const std::ofstream user(buffer_, std::ios::app);
        EXPECT_EQ(refusal(), "1 recover-buffer: waiting.rqf: a process, such as syslog-ng, has it open\n");
    }
    fs::resize_file(buffer_, 6000);
    EXPECT_THAT(refusal(), HasSubstr("1 recover-buffer: waiting.rqf: it is damaged: "));
    WriteFile(buffer_, "no buffer");
    EXPECT_THAT(refusal(), HasSubstr("1 recover-buffer: waiting.rqf: dqtool cannot read it: "));
    fs::remove(buffer_);
    EXPECT_EQ(refusal(), "1 recover-buffer: waiting.rqf: No such file or directory\n");
}
