#include "receive/rate_limiter.h"

#include <gtest/gtest.h>

#include <vector>

using kelo::tool::RateLimiter;

TEST(RateLimiter, BoundsEveryMinuteAndTellsTheRest) {
    struct Step {
        int64_t now;
        int matches;
        int raised;
        uint64_t told; // asked after the matches
    };
    const struct {
        const char *what;
        uint64_t perMinute;
        std::vector<Step> steps;
        uint64_t rest;
    } kCases[] = {
        {"few matches", 3, {{0, 2, 2, 0}, {30, 1, 1, 0}, {60, 3, 3, 0}, {7200, 1, 1, 0}}, 0},
        {"a flood", 3, {{5, 10, 3, 0}, {64, 5, 0, 0}, {65, 0, 0, 12}, {66, 5, 2, 0}, {124, 0, 0, 0}}, 3},
        {"told after matches of the next minute", 3, {{0, 4, 3, 0}, {60, 5, 2, 1}, {120, 0, 0, 3}}, 0},
        {"one a minute", 1, {{0, 3, 1, 0}, {60, 2, 0, 2}, {120, 2, 0, 2}, {180, 0, 0, 2}, {240, 1, 1, 0}}, 0},
        {"a flood long ago", 2, {{-100, 5, 2, 0}, {1000, 0, 0, 3}, {1000, 4, 1, 0}}, 3},
    };
    for (const auto &[what, perMinute, steps, rest] : kCases) {
        RateLimiter limit(perMinute);
        for (const auto &[now, matches, raised, told] : steps) {
            int admitted = 0;
            for (int i = 0; i < matches; ++i)
                admitted += limit.Allow(now) ? 1 : 0;
            EXPECT_EQ(admitted, raised) << what << " at " << now;
            EXPECT_EQ(limit.TakeSuppressed(now), told) << what << " at " << now;
        }
        EXPECT_EQ(limit.Drain(), rest) << what;
    }
}
