#include "receive/rate_limiter.h"

#include <gtest/gtest.h>

#include <vector>

using kelo::tool::RateLimiter;

TEST(RateLimiter, BoundsEveryMinuteAndTellsTheRestOfEachRule) {
    using Counts = RateLimiter::Counts;
    struct Step {
        int64_t now;
        std::string matches; // a letter for the rule of each
        std::string raised;
        Counts told; // asked after the matches
    };
    const struct {
        const char *what;
        std::vector<Step> steps;
        Counts rest;
    } kCases[] = {
        {"few matches",
         {{0, "aa", "aa", {}}, {30, "a", "a", {}}, {60, "aaa", "aaa", {}}, {7200, "a", "a", {}}},
         {}},
        {"a flood",
         {{5, "aaaaaaaaaa", "aaa", {}},
          {64, "aa", "", {}},
          {65, "", "", {{"a", 9}}},
          {66, "aaaaa", "aaa", {}},
          {124, "", "", {}}},
         {{"a", 2}}},
        {"told after matches of the next minute",
         {{0, "aaaa", "aaa", {}}, {60, "aaaa", "aaa", {{"a", 1}}}, {120, "", "", {{"a", 1}}}},
         {}},
        {"a rare rule beside a noisy one", {{0, "aaaaaab", "aaab", {}}, {60, "", "", {{"a", 3}}}}, {}},
        {"many noisy rules: five in all, and one of each",
         {{0, "aaaabbbbccd", "aaabbcd", {}}, {60, "", "", {{"a", 1}, {"b", 2}, {"c", 1}}}},
         {}},
        {"a flood long ago",
         {{-100, "aaaaa", "aaa", {}}, {1000, "", "", {{"a", 2}}}, {1000, "aaaa", "aaa", {}}},
         {{"a", 1}}},
    };
    for (const auto &[what, steps, rest] : kCases) {
        RateLimiter limit(3, 5);
        for (const auto &[now, matches, expected, told] : steps) {
            std::string raised;
            for (const char rule : matches)
                raised += limit.Allow(std::string(1, rule), now) ? std::string(1, rule) : "";
            EXPECT_EQ(raised, expected) << what << " at " << now;
            EXPECT_EQ(limit.TakeSuppressed(now), told) << what << " at " << now;
        }
        EXPECT_EQ(limit.HasSuppressed(), !rest.empty()) << what;
        EXPECT_EQ(limit.Drain(), rest) << what;
    }
}
