#include "accounting/accounting_fixture.h"

using namespace kelo::test;

namespace {

using Names = std::vector<std::string>;

using Accounting = AccountingTest;

TEST_F(Accounting, ClosesASampleAtTheFirstLogOfANewSecond) {
    const struct {
        std::vector<std::pair<time_t, Names>> logs; // devices by second
        std::string samples;
        int64_t open; // logs in the sample that is still open
    } cases[] = {
        {{{1000, {"a", "b", "c"}}}, "1000 a 1", 2},
        {{{1000, {"a", "b", "a", "a"}}, {1001, {"c"}}}, "1000 a 1;1001 a 2;1001 b 1", 1},
        // The clock jumps back.
        {{{1000, {"a", "a"}}, {990, {"b"}}, {1000, {"c"}}}, "1000 a 1;990 a 1;1000 b 1", 1},
        {{{5000000000, {"a", "a"}}}, "5000000000 a 1", 1},
        // Devices are in the order of their bytes.
        {{{1, {"x", "b", "B", "\xff", "b"}}, {2, {"x", "x"}}}, "1 x 1;2 B 1;2 b 2;2 \xff 1", 2},
    };
    for (const auto &c : cases) {
        SCOPED_TRACE(c.samples);
        RunSql(path_, "DELETE FROM eps");
        AccountingManager accounting;
        for (const auto &[second, devices] : c.logs) {
            machine.now = second;
            for (const std::string &device : devices)
                EXPECT_EQ(accounting.LogInc(device), 0);
        }
        EXPECT_EQ(accounting.AccoutingFlush2DB(), 0);
        EXPECT_EQ(Samples(), c.samples);
        EXPECT_EQ(accounting.CurrentEpsGet(), c.open);
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
            machine.now = second;
            EXPECT_EQ(accounting.isNeed2Flush(), isDue) << second;
        }
    }
}

// A statement is a C string: what follows a NUL in a name is not stored, and of names that are the same up to
// there the last one counts.
TEST_F(Accounting, KeepsNamesAndCountsAcrossRestarts) {
    const Names devices = {"zeta",
                           "O'Brien",
                           "",
                           "\xff\xfe",
                           "%q%s%n",
                           std::string(10000, 'x'),
                           "new\nline",
                           std::string("nul\0one", 7),
                           std::string("nul\0two", 7)};
    const Names stored = {"",     "%q%s%n",  "O'Brien", "new\nline", "nul", std::string(10000, 'x'),
                          "zeta", "\xff\xfe"};
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
    EXPECT_THAT(Messages(), IsEmpty());
}

TEST_F(Accounting, NotifiesWhenASampleReachesARule) {
    WriteRules(RuleText("R", 1, "", "3", ""));
    const std::string events = root_.File("usr/kelo/etc/kelosyslog.db");
    AccountingManager accounting;
    const auto countSecond = [&](int logs) {
        ++machine.now;
        for (int i = 0; i < logs; ++i)
            accounting.LogInc("a");
    };
    countSecond(1); // joins the next sample
    countSecond(2);
    EXPECT_THAT(NotifyCalls::Sent(), IsEmpty());
    countSecond(3);
    EXPECT_THAT(NotifyCalls::Sent(), IsEmpty());
    NotifyCalls::AnswerWith(-1);
    countSecond(4);
    ASSERT_EQ(NotifyCalls::Sent().size(), 1u);
    EXPECT_EQ(NotifyCalls::Sent()[0].values.at("%EPS%"), "3");
    EXPECT_THAT(Messages(), Contains("Fail to send syslog notification"));
    EXPECT_EQ(QueryText(events, "SELECT count(*) FROM log"), "1");
    NotifyCalls::AnswerWith(0);
    countSecond(1);
    EXPECT_THAT(Messages(), IsEmpty());
    EXPECT_EQ(QueryText(events, "SELECT count(*) FROM log"), "2");
    EXPECT_EQ(accounting.CurrentEpsGet(), 1);
}

} // namespace
