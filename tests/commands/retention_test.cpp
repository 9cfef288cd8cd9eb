// kelosyslog retention as its timer and an administrator run it.

#include "support/program_test.h"
#include "support/volume.h"

namespace kelo::test {
namespace {

class RetentionProgram : public ProgramTest {
protected:
    RetentionProgram() { CreateLogDatabase(logs_); }

    // `count` records, one an hour, the last half an hour ago.
    void Insert(int count) const {
        RunSql(logs_, "WITH RECURSIVE c(n) AS (SELECT " + std::to_string(count - 1) +
                          " UNION ALL SELECT n - 1 FROM c WHERE n > 0) INSERT INTO logs (msg, utcsec) "
                          "SELECT printf('%200d', n), strftime('%s') - 1800 - 3600 * n FROM c");
    }
    std::string Records() const { return RunSql(logs_, "SELECT count(*) FROM logs"); }
    void Follow(const std::string &rule, int status, const std::string &out) const {
        WriteFile(rule_, rule);
        Expect("retention --yes", status, out.empty() ? std::optional<std::string>() : out);
    }

    const std::string rule_ = root_.File("etc/kelosyslog/retention.conf");
    const std::string link_ = root_.File("etc/syslog-ng/conf.d/kelosyslog.conf");
};

TEST_F(RetentionProgram, RefusesRulesThatAreSenselessOrRemoveEverything) {
    Insert(50);
    RunSql(logs_, "UPDATE logs SET utcsec = utcsec - 10000");
    const std::pair<std::string, std::string> cases[] = {
        {"kep=\"90d\"", ":1: kep: no setting"},
        {"# mine\n\nkeep", ":3: keep: no setting"},
        {"keep=\"90\"", ":1: keep: '90' is no age"},
        {"keep=\"2020-01-01\"", "is no age"},
        {"keep=\"10s\"", "would remove what has just arrived"},
        {"keep=\"90d\"\nkeep=\"80d\"", ":2: keep: is set twice"},
        {"keep=\"2h\"", "keep=\"2h\" would remove every record"},
        {"keep_size=\"many\"", "is no size"},
        {"keep_size=\"1M\"", "would remove nearly everything"},
        {"keep_size=\"8000T\"", "has no effect: the volume has"},
        {"min_free=\"5%\"", "needs when_full"},
        {"when_full=\"stop\"", "needs min_free"},
        {"min_free=\"51%\"\nwhen_full=\"stop\"", "more than half of the volume"},
        {"min_free=\"1M\"\nwhen_full=\"stop\"", "is too late"},
        {"min_free=\"5%\"\nwhen_full=\"panic\"", "'panic' is neither remove nor stop"},
    };
    for (const auto &[rule, reason] : cases) {
        WriteFile(rule_, rule);
        for (const char *how : {"--yes", "--dry-run"}) {
            const ProgramResult result = Run(std::string("retention ") + how);
            EXPECT_EQ(result.status, 3) << rule;
            EXPECT_THAT(result.err, HasSubstr(reason));
        }
        EXPECT_THAT(Run("status --control none").out, HasSubstr("! the rule of retention is not followed: "));
    }
    EXPECT_EQ(Records(), "50");
}

TEST_F(RetentionProgram, RemovesTheOldestByAgeAndBySize) {
    Insert(100'000);
    Expect("retention --yes", 1, "no rule in " + rule_ + ": records stay\n");
    WriteFile(rule_, "keep = \"3000d\" # not a comment\n");
    Expect("retention --yes", 3);
    WriteFile(rule_, "keep=\"3000d\"\n");
    EXPECT_THAT(Run("retention --dry-run").out, HasSubstr("would remove 28000 records of before "));
    EXPECT_EQ(Records(), "100000");
    Expect("retention", 2); // no terminal to ask on
    Expect("retention --yes", 0);
    EXPECT_EQ(Records(), "72000");
    Expect("retention --yes", 1, "");

    WriteFile(rule_, "keep_size=\"16M\"\n");
    Expect("retention --yes", 0);
    const int left = std::stoi(Records());
    EXPECT_GT(left, 40'000);
    EXPECT_LT(left, 65'000);
    EXPECT_EQ(RunSql(logs_, "SELECT max(id) - min(id) + 1 FROM logs"), std::to_string(left))
        << "it was not the oldest that went";
    Expect("retention --yes", 1, "");
}

TEST_F(RetentionProgram, AnswersAVolumeThatFills) {
    fs::remove(logs_);
    const Volume volume(fs::path(logs_).parent_path(), "128M");
    if (!volume.IsMounted())
        GTEST_SKIP() << "no permission to mount a file system";
    CreateLogDatabase(logs_);
    Insert(200'000);
    fs::create_directories(fs::path(link_).parent_path());
    fs::create_symlink("target", link_);
    fs::create_symlink("/bin/sleep", root_.File("syslog-ng"));
    const auto start = [this] {
        auto daemon = std::make_unique<ChildProgram>(root_.Path(), "exec ./syslog-ng 1000");
        EXPECT_TRUE(daemon->AwaitName("syslog-ng"));
        WriteFile(root_.File("run/syslog-ng.pid"), std::to_string(daemon->Pid()));
        return daemon;
    };
    const std::string stop = "min_free=\"32M\"\nwhen_full=\"stop\"\n";
    const std::string events = "SELECT group_concat(event) FROM log";
    WriteFile(rule_, stop);
    Expect("retention --yes", 1, "");

    WriteFile(root_.File("var/log/kelosyslog/other"), std::string(60 << 20, 'x'));
    Expect("retention --yes", 4); // syslog-ng does not run
    EXPECT_TRUE(fs::is_symlink(link_));
    auto syslogNg = start();
    Expect("retention --yes", 0, "stopped receiving\n");
    EXPECT_EQ(syslogNg->AwaitEnd().status, -SIGHUP);
    EXPECT_FALSE(fs::is_symlink(link_));
    EXPECT_EQ(RunSql(events_, events), "Volume space is not enough.");
    EXPECT_THAT(Run("status --control none").out, HasSubstr("! receiving is stopped"));
    Expect("retention --yes", 1, "");
    EXPECT_EQ(Records(), "200000");

    syslogNg = start();
    Follow("min_free=\"32M\"\nwhen_full=\"remove\"\n", 0, "");
    EXPECT_TRUE(fs::is_symlink(link_));
    EXPECT_LT(std::stoi(Records()), 200'000);
    fs::resize_file(root_.File("var/log/kelosyslog/other"), 66 << 20);
    const std::string left = Records();
    Follow("min_free=\"60M\"\nwhen_full=\"remove\"\n", 3, ""); // nearly all would have to go
    EXPECT_EQ(Records(), left);
    fs::remove(root_.File("var/log/kelosyslog/other"));
    fs::create_symlink("target", link_ + ".stopped"); // when the link was created again
    Follow(stop, 1, "");
    EXPECT_EQ(RunSql(events_, events), "Volume space is not enough.");
    EXPECT_EQ(std::distance(fs::directory_iterator(spool_ + "new"), {}), 1);
}

} // namespace
} // namespace kelo::test
