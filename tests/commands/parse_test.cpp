#include <sched.h>

#include "support/test.h"

using namespace kelo::test;

namespace {

constexpr int kBatchRows = 5000;
const std::string kEleven = "local0 info 2020/01/02 10:11:12 100 200 +08:00 nas 127.0.0.1 prog tag";

std::string Lines(int first, int count) {
    std::string text;
    for (int number = first; number < first + count; ++number)
        text += kEleven + " message " + std::to_string(number) + "\n";
    return text;
}

class ParseProgram : public testing::Test {
protected:
    // Runs "kelosyslog parse ARGUMENTS" in the folder through the shell, after the commands in `before`.
    int Run(const std::string &arguments, const std::string &before = "") {
        const std::string command = "cd " + root_.Path() + "; " + before + " exec " KELO_PROGRAM " >" +
                                    Out() + " 2>" + Err() + " parse " + arguments;
        const int status = std::system(command.c_str());
        return WIFEXITED(status) ? WEXITSTATUS(status) : -1;
    }

    // Starts storing the standard input, which is `input`, into the database.
    pid_t StartStoring(int input) {
        const pid_t child = fork();
        if (child == 0) {
            if (dup2(input, STDIN_FILENO) == STDIN_FILENO && freopen(Err().c_str(), "w", stderr) != nullptr)
                execl(KELO_PROGRAM, KELO_PROGRAM, "parse", "--db", Db().c_str(), "--resume", nullptr);
            _exit(127);
        }
        close(input);
        return child;
    }

    // Waits until the database holds `rows`, or the program ends, whose status is stored then.
    bool AwaitRows(pid_t child, int rows, int &status) {
        while (waitpid(child, &status, WNOHANG) == 0) {
            if (std::filesystem::exists(Db()) && Rows() >= rows)
                return true;
            sched_yield();
        }
        return false;
    }

    int Rows() const { return std::atoi(QueryText(Db(), "SELECT count(*) FROM logs").c_str()); }
    // Whether the database holds "message 0" to "message COUNT-1" once each and in order, and is sound.
    bool HoldsMessages(int count) const {
        const std::string total = std::to_string(count);
        return QueryText(Db(), "SELECT count(*) || ' ' || sum(msg = 'message ' || (id - 1)) FROM logs") ==
                   total + " " + total &&
               QueryText(Db(), "PRAGMA integrity_check") == "ok";
    }
    size_t FileCount() const {
        const std::filesystem::directory_iterator files(root_.Path());
        return static_cast<size_t>(std::distance(begin(files), end(files)));
    }

    void Write(const std::string &name, const std::string &content) { WriteFile(root_.File(name), content); }
    std::string Db() const { return root_.File("logs.db"); }
    std::string Out() const { return outputs_.File("out"); }
    std::string Err() const { return outputs_.File("err"); }

    kelo::test::TempRoot root_;
    kelo::test::TempRoot outputs_;
};

} // namespace

TEST_F(ParseProgram, AccountsForEveryLine) {
    const std::string text = kEleven + " one\r\n\n" + kEleven + "\n   \nshort line\n" + kEleven +
                             std::string(" \xff\0\n", 4) + std::string(17 << 20, 'x') + "\n" + kEleven +
                             " last";
    Write("in", text);
    EXPECT_EQ(Run("-v -o csv --no-header --fields prio,msg in"), 0);
    EXPECT_EQ(ReadFile(Out()), std::string("info,\"one\r\"\r\ninfo,\r\ninfo,\xff\0\r\ninfo,last\r\n", 40));
    EXPECT_EQ(
        ReadFile(Err()),
        "kelosyslog: in:3: incomplete: msg is empty\n"
        "kelosyslog: in:4: rejected: 0 of 11 fields\n"
        "kelosyslog: in:5: rejected: 2 of 11 fields\n"
        "kelosyslog: in:7: rejected: too long\n"
        "kelosyslog: 4 parsed, 1 of them incomplete (msg is empty), 2 rejected (fewer than 11 fields), 1 "
        "rejected (too long)\n");
    EXPECT_EQ(Run("--db logs.db --skip-incomplete in - <in"), 0);
    EXPECT_EQ(Rows(), 6);
    EXPECT_EQ(QueryText(Db(),
                        "SELECT host||ip||fac||prio||llevel||tag||utcsec||tzoffset||ldate||ltime||prog||"
                        "hex(msg) FROM logs WHERE id=2"),
              "nas127.0.0.1local0infoinfotag100+08:002020/01/0210:11:12progFF00");
}

TEST_F(ParseProgram, StoresWholeBatchesWhenKilledAndResumes) {
    constexpr int kTotal = 12 * kBatchRows + 17;
    Write("in", Lines(0, kTotal));
    for (const int rows : {1, 3 * kBatchRows, 6 * kBatchRows}) {
        int status = 0;
        const pid_t child = StartStoring(open(root_.File("in").c_str(), O_RDONLY | O_CLOEXEC));
        ASSERT_TRUE(AwaitRows(child, rows, status)) << "ended before it could be killed: " << status;
        kill(child, SIGKILL);
        waitpid(child, &status, 0);
        EXPECT_EQ(Rows() % kBatchRows, 0);
        EXPECT_TRUE(HoldsMessages(Rows())) << Rows();
    }
    EXPECT_EQ(Run("--db logs.db --resume <in"), 0);
    EXPECT_TRUE(HoldsMessages(kTotal));
    EXPECT_EQ(FileCount(), 2U) << "the text and the database";
}

TEST_F(ParseProgram, ResumesWhereTheSameInputEnded) {
    const auto store = [this](const std::string &text, const std::string &input) {
        Write("in", text);
        return Run("--db logs.db --resume -v " + input, input.empty() ? "cat in |" : "");
    };
    for (const char *input : {"in", "- <in", ""}) {
        std::filesystem::remove(Db());
        EXPECT_EQ(store(Lines(0, 10), input), 0);
        EXPECT_EQ(store(Lines(0, 10), input), 1) << "nothing new";
        EXPECT_EQ(store(Lines(0, 300) + "bad\n", input), 0) << "grown";
        EXPECT_THAT(ReadFile(Err()), HasSubstr(":301: rejected")) << "line numbers go on";
        EXPECT_EQ(store(Lines(0, 300) + "bad\n" + Lines(300, 7), input), 0);
        EXPECT_TRUE(HoldsMessages(307)) << input;
        EXPECT_EQ(store(Lines(0, 200), input), 2) << "shorter than what is stored";
        EXPECT_EQ(store(Lines(307, 5), input), 0) << "other content under the same name";
        EXPECT_THAT(ReadFile(Err()), HasSubstr("begins differently"));
        EXPECT_TRUE(HoldsMessages(312));
    }
}

TEST_F(ParseProgram, LeavesNothingHalfWrittenWhenTheDiskIsFull) {
    constexpr int kTotal = 4 * kBatchRows;
    Write("in", Lines(0, kTotal));
    const std::string limit = "trap '' XFSZ; ulimit -f "; // in 512-byte blocks
    EXPECT_EQ(Run("--db logs.db in", limit + "8;"), 3);
    EXPECT_EQ(FileCount(), 1U) << "no database that is not complete";

    EXPECT_EQ(Run("--db logs.db in", limit + "2000;"), 3);
    const std::string error = ReadFile(Err());
    EXPECT_THAT(error, StartsWith("kelosyslog: " + Db() + ": "));
    EXPECT_EQ(std::count(error.begin(), error.end(), '\n'), 1);
    EXPECT_GT(Rows(), 0);
    EXPECT_LT(Rows(), kTotal);
    EXPECT_EQ(Rows() % kBatchRows, 0);
    EXPECT_EQ(Run("--db logs.db --resume in"), 0);
    EXPECT_TRUE(HoldsMessages(kTotal));
}

TEST_F(ParseProgram, NamesWhatCannotBeUsed) {
    Write("in", Lines(0, 1));
    kelo::test::RunSql(root_.File("other.db"), "CREATE TABLE other(x)");
    const struct {
        const char *arguments;
        int status;
        const char *error;
    } kCases[] = {
        {"in missing", 2, "missing: No such file or directory"},
        {"--db logs.db in .", 2, ".: Is a directory"},
        {"--db no/logs.db in", 3, "no/logs.db: unable to open database file (No such file or directory)"},
        {"--db in in", 3, "in: file is not a database"},
        {"--db other.db in", 3, "other.db: no such table: logs"},
        {"--db logs.db -o csv in", 2, "--output"},
        {"--resume in", 2, "--db"},
        {"- in - </dev/null", 2, "'-'"},
        {"-o csv in >/dev/full", 4, "No space left on device"},
        {"</dev/null", 1, "0 parsed"},
    };
    for (const auto &[arguments, status, error] : kCases) {
        EXPECT_EQ(Run(arguments), status) << arguments;
        EXPECT_THAT(ReadFile(Err()), HasSubstr(error)) << arguments;
    }
    EXPECT_EQ(FileCount(), 2U);
    EXPECT_EQ(QueryText(root_.File("other.db"), "SELECT count(*) FROM sqlite_schema"), "1");
}
