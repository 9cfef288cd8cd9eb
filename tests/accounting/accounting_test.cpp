#include "kelosyslog/accounting.h"

#include "notify/notify_fixture.h"

namespace {

time_t now = 1000; // the machine's clock for the whole program

} // namespace

extern "C" time_t time(time_t *seconds) noexcept {
    if (seconds != nullptr)
        *seconds = now;
    return now;
}

namespace kelo::test {
namespace {

using Names = std::vector<std::string>;

const std::string kRows = "1000 a 1;1001 a 1;1001 b'c 1";

// An accounting database and an event database of the shipped schemas under a root of its own, no rules, and
// a clock that stands still until a test moves it.
class Accounting : public NotifyTest {
protected:
    Accounting() {
        now = 1000;
        CreateLogDatabase(path_, "accinfo.sql");
        CreateLogDatabase(events_, "kelosyslog.sql");
        WriteRules("");
    }

    // The rows of table "eps" in the order of their insertion: "stamp device eps;..."
    std::string Samples() const {
        return RunSql(path_, "SELECT group_concat(stamp || ' ' || device || ' ' || eps, ';') FROM (SELECT * "
                             "FROM eps ORDER BY id)");
    }
    // The rows of table "histogram": "device count;..." in byte order.
    std::string Histogram() const {
        return RunSql(path_, "SELECT group_concat(device || ' ' || count, ';') FROM (SELECT * FROM histogram "
                             "ORDER BY device)");
    }
    // Three sample rows that wait for a flush, and a log in the open sample.
    static void CountLogs(AccountingManager &accounting) {
        for (const auto &[second, device] : {std::pair(1000, "a"), {1000, "a"}, {1000, "b'c"}, {1001, "d"}}) {
            now = second;
            accounting.LogInc(device);
        }
    }

    const std::string path_ = root_.File("var/log/kelolog/.KELOACCOUNTDB");
    const std::string events_ = root_.File("usr/kelo/etc/kelosyslog.db");
};

TEST_F(Accounting, ClosesASampleAtTheFirstLogOfANewSecond) {
    // Devices by second, the samples, and the logs in the sample that is still open.
    const std::tuple<std::vector<std::pair<time_t, Names>>, std::string, int64_t> cases[] = {
        {{{1000, {"a", "b", "c"}}}, "1000 a 1", 2},
        {{{1000, {"a", "b", "a", "a"}}, {1001, {"c"}}}, "1000 a 1;1001 a 2;1001 b 1", 1},
        // The clock jumps back.
        {{{1000, {"a", "a"}}, {990, {"b"}}, {1000, {"c"}}}, "1000 a 1;990 a 1;1000 b 1", 1},
        {{{5000000000, {"a", "a"}}}, "5000000000 a 1", 1},
        // Devices are in the order of their bytes.
        {{{1, {"x", "b", "B", "\xff", "b"}}, {2, {"x", "x"}}}, "1 x 1;2 B 1;2 b 2;2 \xff 1", 2},
    };
    for (const auto &[logs, samples, open] : cases) {
        SCOPED_TRACE(samples);
        RunSql(path_, "DELETE FROM eps");
        AccountingManager accounting;
        for (const auto &[second, devices] : logs) {
            now = second;
            for (const std::string &device : devices)
                EXPECT_EQ(accounting.LogInc(device), 0);
        }
        EXPECT_EQ(accounting.AccoutingFlush2DB(), 0);
        EXPECT_EQ(Samples(), samples);
        EXPECT_EQ(accounting.CurrentEpsGet(), open);
    }
}

TEST_F(Accounting, AsksForAFlushOnABeatAboveFiveSeconds) {
    const std::vector<std::pair<time_t, bool>> cases[] = {
        {{1000, true}, {1005, false}, {1011, true}},
        {{1000, true}, {1003, false}, {1006, false}, {1009, false}},
        {{1000, true}, {900, false}, {906, true}},                     // the clock jumps back
        {{0x7ffffffe, true}, {0x80000003, false}, {0x80000009, true}}, // the clock passes 2038
    };
    for (const auto &calls : cases) {
        AccountingManager accounting;
        for (const auto &[second, isDue] : calls) {
            now = second;
            EXPECT_EQ(accounting.isNeed2Flush(), isDue) << second;
        }
    }
}

// A statement is a C string: what follows a NUL in a name is not stored, and of names that are the same up to
// there the last one counts.
TEST_F(Accounting, KeepsNamesAndCountsAcrossRestarts) {
    const std::string longName(10000, 'x');
    const Names devices = {"zeta",          "O'Brien",      "", "\xff\xfe", "%q%s%n", longName, "new\nline",
                           {"nul\0one", 7}, {"nul\0two", 7}};
    const Names stored = {"", "%q%s%n", "O'Brien", "new\nline", "nul", longName, "zeta", "\xff\xfe"};
    for (int start = 1; start <= 3; ++start) {
        AccountingManager accounting;
        Names names;
        for (const KELOLOG_LOG_DEVICE_STATISTIC &entry : accounting.HistogramGet()) {
            names.push_back(entry.device);
            EXPECT_EQ(entry.count, static_cast<uint64_t>(start - 1)) << entry.device;
        }
        EXPECT_EQ(names, start == 1 ? Names() : stored);
        EXPECT_EQ(accounting.TotalCountGet(), 0);
        for (const std::string &device : start == 1 ? devices : stored)
            accounting.LogInc(device);
    }
    EXPECT_EQ(SyslogDBHistGet(path_, 0).at("zeta"), 3u);
    EXPECT_THAT(TakeTexts(), IsEmpty());
}

TEST_F(Accounting, TakesADatabaseByItsPath) {
    const std::string other = root_.File("other.db");
    CreateLogDatabase(other, "accinfo.sql");
    RunSql(other, "INSERT INTO histogram VALUES(NULL, 'a', 40)");
    AccountingManager accounting(other);
    CountLogs(accounting);
    EXPECT_EQ(accounting.AccoutingFlush2DB(), 0);
    EXPECT_EQ(RunSql(other, "SELECT count > 40 FROM histogram WHERE device = 'a'"), "1");
    EXPECT_EQ(Samples(), "");
}

TEST_F(Accounting, TellsNamesApartThatDifferInAnyByteOrInTheirSize) {
    Names names;
    for (size_t size = 0; size <= 20; ++size) {
        const std::string name(size, 'a');
        names.push_back(name);
        for (size_t i = 0; i < size; ++i) {
            for (char other = 0; other < 32; ++other)
                names.emplace_back(name)[i] = other;
        }
    }
    AccountingManager accounting;
    for (size_t count = 0; count < 2; ++count) {
        for (const std::string &name : names)
            accounting.LogInc(name);
    }
    const auto histogram = accounting.HistogramGet();
    ASSERT_EQ(histogram.size(), names.size());
    EXPECT_TRUE(
        std::equal(names.begin(), names.end(), histogram.begin(), [](const auto &name, const auto &device) {
            return device.device == name && device.count == 2;
        }));
}

TEST_F(Accounting, CountsManyDevicesExactly) {
    AccountingManager accounting;
    std::map<std::string, uint64_t> counted;
    for (uint64_t log = 0; log < 20000; ++log) {
        const std::string device = "device " + std::to_string(log % 3 == 0 ? log % 7 : log * 7919 % 2000);
        ++counted[device];
        now += log % 5000 == 0;
        accounting.LogInc(device);
    }
    ++now;
    accounting.CurEpsUpdate();
    EXPECT_EQ(accounting.AccoutingFlush2DB(), 0);
    EXPECT_EQ(SyslogDBHistGet(path_, 0), counted);
    EXPECT_EQ(RunSql(path_, "SELECT sum(eps) FROM eps"), "20000");
    EXPECT_EQ(accounting.TotalCountGet(), 20000);
}

TEST_F(Accounting, NotifiesWhenASampleReachesARule) {
    WriteRules(RuleText("R", 1, "", "3", ""));
    AccountingManager accounting;
    const auto countSecond = [&](int logs) {
        ++now;
        for (int i = 0; i < logs; ++i)
            accounting.LogInc("a");
    };
    for (const int logs : {1, 2, 3}) { // the first one joins the next sample
        countSecond(logs);
        EXPECT_THAT(PlatformCalls::Sent(), IsEmpty());
    }
    PlatformCalls::answers.notification = -1;
    countSecond(4);
    ASSERT_EQ(PlatformCalls::Sent().size(), 1u);
    EXPECT_EQ(PlatformCalls::Sent()[0].values.at("%EPS%"), "3");
    EXPECT_THAT(TakeTexts(), Contains("Fail to send syslog notification"));
    EXPECT_EQ(RunSql(events_, "SELECT count(*) FROM log"), "1");
    PlatformCalls::answers.notification = 0;
    countSecond(1);
    EXPECT_THAT(TakeTexts(), IsEmpty());
    EXPECT_EQ(RunSql(events_, "SELECT count(*) FROM log"), "2");
    std::vector<uint64_t> samples;
    accounting.EpsHandlerSet([&](uint64_t eps) { samples.push_back(eps); });
    countSecond(5);
    countSecond(1);
    EXPECT_THAT(samples, ElementsAre(1, 5));
    EXPECT_EQ(PlatformCalls::Sent().size(), 2u) << "only the handler learns of them";
}

TEST_F(Accounting, GivesUpTheOldestSamplesAboveABound) {
    AccountingManager accounting;
    CountLogs(accounting);
    EXPECT_EQ(accounting.SamplesDrop(2, 3), 0U);
    EXPECT_EQ(accounting.SamplesDrop(2, 2), 1U);
    EXPECT_EQ(accounting.AccoutingFlush2DB(), 0);
    EXPECT_EQ("1000 a 1;" + Samples(), kRows);
    EXPECT_EQ(Histogram(), "a 2;b'c 1;d 1");
    PlatformCalls::Reset();
    EXPECT_EQ(accounting.AccoutingFlush2DB(), 0);
    EXPECT_THAT(PlatformCalls::Recorded(), IsEmpty()) << "without samples there is nothing to do";
}

TEST_F(Accounting, TrimsOldSamplesOfALargeFile) {
    // Within a day, with room for a slow machine.
    const std::string stamp = RunSql(path_, "SELECT strftime('%s', 'now') - 24*60*60 + 600");
    const std::string trim = "DELETE FROM eps WHERE stamp < strftime('%s', 'now') - 24*60*60;";
    const std::string recent = stamp + " new 1";
    const std::string all = "999 old 1;" + recent + ";" + kRows;
    // Bytes of filler, whether the trim fails, and the samples then.
    const std::tuple<int, bool, std::string> cases[] = {
        {5000000, false, all}, {5300000, true, all}, {5300000, false, recent}};
    for (const auto &[filler, fails, samples] : cases) {
        SCOPED_TRACE(filler + fails);
        RunSql(path_, "DELETE FROM eps; DELETE FROM histogram");
        AccountingManager accounting;
        CountLogs(accounting);
        RunSql(path_, "INSERT INTO eps VALUES(NULL, 999, 'old', 1), (NULL, " + stamp + ", 'new', 1);" +
                          "CREATE TABLE filler AS SELECT zeroblob(" + std::to_string(filler) + ")");
        PlatformCalls::FailFrom(fails ? 9 : 1000, 1);
        EXPECT_EQ(accounting.AccoutingFlush2DB(), 0);
        RunSql(path_, "DROP TABLE filler; VACUUM");
        EXPECT_EQ(Samples(), samples);
        EXPECT_EQ(TakeTexts(), fails ? Names{"Fail to execute SQL command: " + trim} : Names());
    }
}

} // namespace
} // namespace kelo::test
