#include "support/program_test.h"

namespace kelo::test {
namespace {

class Parse : public ProgramTest {
protected:
    void Write(const std::string &content) const { WriteFile(root_.File("in"), content); }
    // Expects "message 0" to "message COUNT-1" once each and in order in a sound database.
    void ExpectMessages(int count) const {
        const std::string total = std::to_string(count);
        EXPECT_EQ(RunSql(db_, "SELECT count(*) || ' ' || sum(msg = 'message ' || (id - 1)) FROM logs"),
                  total + " " + total);
        EXPECT_EQ(RunSql(db_, "PRAGMA integrity_check"), "ok");
    }

    const std::string db_ = root_.File("logs.db");
};

TEST_F(Parse, AccountsForEveryLine) {
    Write(kLogHead + "one\r\n\n" + kLogHead + "\n   \nshort line\n" + kLogHead + std::string("\xff\0\n", 3) +
          std::string(17 << 20, 'x') + "\n" + kLogHead + "last");
    const ProgramResult result = Run("parse -v -o csv --no-header --fields prio,msg in");
    EXPECT_EQ(result.status, 0);
    EXPECT_EQ(result.out, std::string("info,\"one\r\"\r\ninfo,\r\ninfo,\xff\0\r\ninfo,last\r\n", 40));
    EXPECT_EQ(
        result.err,
        "kelosyslog: in:3: incomplete: msg is empty\n"
        "kelosyslog: in:4: rejected: 0 of 11 fields\n"
        "kelosyslog: in:5: rejected: 2 of 11 fields\n"
        "kelosyslog: in:7: rejected: too long\n"
        "kelosyslog: 4 parsed, 1 of them incomplete (msg is empty), 2 rejected (fewer than 11 fields), 1 "
        "rejected (too long)\n");
    Expect("parse --db logs.db --skip-incomplete in - <in", 0);
    EXPECT_EQ(RunSql(db_, "SELECT count(*) FROM logs"), "6");
    EXPECT_EQ(RunSql(db_, "SELECT host||ip||fac||prio||llevel||tag||utcsec||tzoffset||ldate||ltime||prog||"
                          "hex(msg) FROM logs WHERE id=2"),
              "nas127.0.0.1local0infoinfotag100+08:002020/01/0210:11:12progFF00");
}

TEST_F(Parse, ResumesWhereTheSameInputEnded) {
    ProgramResult result;
    for (const std::string input :
         {"exec kelosyslog parse in", "exec kelosyslog parse - <in", "cat in | kelosyslog parse"}) {
        const auto expect = [&](int status, const std::string &text) {
            Write(text);
            result = RunIn(root_.Path(), input + " --db logs.db --resume -v");
            EXPECT_EQ(result.status, status) << input << result.err;
        };
        fs::remove(db_);
        expect(0, LogLines(0, 10));
        expect(1, LogLines(0, 10));
        expect(0, LogLines(0, 300) + "bad\n");
        EXPECT_THAT(result.err, HasSubstr(":301: rejected")) << "line numbers go on";
        expect(0, LogLines(0, 300) + "bad\n" + LogLines(300, 7));
        ExpectMessages(307);
        expect(2, LogLines(0, 200)); // shorter than what is stored
        expect(0, LogLines(307, 5)); // other content under the same name
        EXPECT_THAT(result.err, HasSubstr("begins differently"));
        ExpectMessages(312);
    }
}

TEST_F(Parse, LeavesNothingHalfWrittenWhenTheDiskIsFull) {
    Write(LogLines(0, 20000));
    for (const auto &[blocks, isCreated] : {std::pair("8", false), {"2000", true}}) { // of 512 bytes
        const ProgramResult result = RunIn(root_.Path(), std::string("trap '' XFSZ; ulimit -f ") + blocks +
                                                             "; exec kelosyslog parse --db logs.db in");
        EXPECT_EQ(result.status, 3);
        EXPECT_THAT(result.err, MatchesRegex("kelosyslog: " + db_ + ": .*\n"));
        EXPECT_EQ(fs::exists(db_), isCreated) << "no database that is not complete";
    }
    EXPECT_EQ(RunSql(db_, "SELECT count(*) BETWEEN 1 AND 19999 FROM logs"), "1");
    Expect("parse --db logs.db --resume in", 0);
    ExpectMessages(20000);
}

// By a quarantine that was killed between two renames, and by a writer that was killed before it.
TEST_F(Parse, UsesNothingThatAMovedDatabaseHasLeft) {
    Write(LogLines(0, 1));
    const std::string aside = db_ + ".corrupt";
    CreateLogDatabase(db_);
    InsertSampleLogs(db_, 500);
    std::optional<DatabaseLock> user(db_); // keeps the write-ahead log there
    for (const char *file : {"-wal", "-shm"})
        fs::create_hard_link(db_ + file, aside + file);
    fs::rename(db_, aside);
    Expect("parse --db logs.db in", 0);
    ExpectMessages(1);
    user.reset();
    EXPECT_EQ(RunSql(aside, "SELECT count(*) FROM logs"), "500");

    RunSql(aside, "PRAGMA journal_mode=DELETE");
    fs::rename(aside, db_);
    if (fork() == 0) {
        TestDatabase killed(db_);
        killed.Run("PRAGMA cache_size=2; BEGIN; UPDATE logs SET msg = msg || hex(zeroblob(500))");
        _exit(0);
    }
    wait(nullptr);
    ASSERT_TRUE(fs::exists(db_ + "-journal"));
    fs::rename(db_, aside);
    Expect("parse --db logs.db in", 0);
    ExpectMessages(1);
}

} // namespace
} // namespace kelo::test
