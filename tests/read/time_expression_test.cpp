#include "read/time_expression.h"

#include "base/errors.h"
#include "support/test.h"

namespace kelo::tool {
namespace {

void SetZone(const char *name) {
    setenv("TZ", name, 1);
    tzset();
}

// POSIX rules, so that no zone files are needed.
constexpr const char *kUtc = "UTC0";
constexpr const char *kBerlin = "CET-1CEST,M3.5.0,M10.5.0/3";
constexpr const char *kNewYork = "EST5EDT,M3.2.0,M11.1.0";
constexpr const char *kKolkata = "IST-5:30";

constexpr int64_t kNow = 1583020800 + 3600; // 2020-03-01 01:00:00 UTC, the day after a leap day

TEST(TimeExpression, GivesTheSecondThatTheUserMeans) {
    const struct {
        const char *zone;
        const char *text;
        int64_t seconds;
        bool isDayOnly;
    } kCases[] = {
        {kUtc, "2020/01/02", 1577923200, true},
        {kUtc, "2020-01-02 10:11", 1577959860, false},
        {kBerlin, "2020-01-02 10:11:12", 1577959872 - 3600, false},
        {kBerlin, "2020-07-02 00:00", 1593640800, false},
        {kKolkata, "2020-01-02", 1577923200 - 19800, true},
        {kNewYork, "today", 1582952400, true}, // there it is still 29 February
        {kUtc, "tomorrow 1:30", 1583107200 + 5400, false},
        {kUtc, "2000-02-29", 951782400, true},
        {kUtc, "1969-12-31 23:59:59", -1, false},
        {kBerlin, "2020-03-29 02:30", 1585445400, false}, // skipped by the clocks: an hour later
        {kUtc, "now", kNow, false},
        {kUtc, "1h", kNow - 3600, false},
        {kUtc, "1h 30m ago", kNow - 5400, false},
        {kUtc, "1 month", kNow - 2629800, false},
        {kUtc, "1577836800", 1577836800, false},
    };
    for (const auto &test : kCases) {
        SCOPED_TRACE(std::string(test.zone) + " " + test.text);
        SetZone(test.zone);
        const Moment moment = ParseTimeExpression("--since", test.text, kNow);
        EXPECT_EQ(moment.seconds, test.seconds);
        EXPECT_EQ(moment.isDayOnly, test.isDayOnly);
    }
}

// 2020-10-25 02:30 comes twice in Berlin: at 00:30 and at 01:30 UTC.
TEST(TimeExpression, TakesTheFirstOfTwoLocalTimesUnlessItIsStillToCome) {
    constexpr int64_t kFirst = 1603585800;
    for (const char *zone : {kBerlin, "Europe/Berlin"}) {
        SetZone(zone);
        for (const auto &[now, expected] : {std::pair{kFirst + 600, kFirst},
                                            {kFirst + 86400, kFirst},
                                            {kFirst, kFirst},
                                            {kFirst - 1, kFirst + 3600}}) {
            EXPECT_EQ(ParseTimeExpression("--until", "2020-10-25 02:30", now).seconds, expected) << zone;
            SetZone(zone);
            ParseTimeExpression("--since", "2020-01-01", now); // what the C library did last must not matter
            EXPECT_EQ(ParseTimeExpression("--until", "2020-10-25 02:30", now).seconds, expected) << zone;
        }
    }
}

// Midnight to midnight has 23 hours on the day that the clocks go forward.
TEST(TimeExpression, CountsDaysByTheCalendarWhenClocksChange) {
    SetZone(kBerlin);
    constexpr int64_t kMonday = 1585558800; // 2020-03-30 11:00 local time
    const int64_t today = ParseTimeExpression("--since", "today", kMonday).seconds;
    EXPECT_EQ(today - ParseTimeExpression("--since", "yesterday", kMonday).seconds, 23 * 3600);
}

TEST(TimeExpression, RefusesWhatIsNoTimeAndNamesIt) {
    const std::string kBad[] = {"",           "foo",         "2021-02-29", "1900-02-29",   "2020-13-01",
                                "2020-04-31", "2020-01/02",  "1",          "20200102",     "@x",
                                "--1h",       "1 lightyear", "yesterdays", "99999999999y", "10:60",
                                "24:00",      "-1h ago"};
    for (const std::string &text : kBad) {
        try {
            const Moment moment = ParseTimeExpression("--until", text, kNow);
            ADD_FAILURE() << "'" << text << "' is " << moment.seconds;
        } catch (const UsageError &error) {
            EXPECT_EQ(std::string(error.what()).rfind("--until: '" + text + "' is not a time", 0), 0U);
        }
    }
}

} // namespace
} // namespace kelo::tool
