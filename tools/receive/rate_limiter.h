#pragma once

#include <cstdint>
#include <map>
#include <string>
#include <utility>

namespace kelo::tool {

// Prevents a flood of notifications after a flood of matches, and a noisy rule from silencing a rare one.
//
// A minute begins with a match of any rule. In it the notifications of each rule and of all rules together
// are limited, but the first one of each rule is always sent. The rest is counted by rule; one notification
// of the next minute gives the numbers. Times are seconds of any clock that does not go back.
class RateLimiter {
public:
    using Counts = std::map<std::string, uint64_t>; // by rule

    struct State {
        bool hasBegun = false; // a minute
        int64_t begin = 0;
        // In the minute.
        Counts raised;
        Counts suppressed;
        uint64_t raisedByAll = 0;
        Counts toTell; // of the minutes before
    };

    // Notifications a minute; both are at least 1.
    RateLimiter(uint64_t perRule, uint64_t forAll) : perRule_(perRule), forAll_(forAll) {}

    // Whether a match of `rule` at `now` sends a notification. If not, it is counted.
    bool Allow(const std::string &rule, int64_t now);

    // The matches counted in a minute that is over at `now`; empty for none. The caller reports them in one
    // notification, which counts in the new minute.
    Counts TakeSuppressed(int64_t now);

    // Whether there are matches that were counted and not reported yet.
    bool HasSuppressed() const { return !state_.suppressed.empty() || !state_.toTell.empty(); }

    // All of them.
    Counts Drain();

    // To go on in another process.
    const State &StateGet() const { return state_; }
    void StateSet(State state) { state_ = std::move(state); }

private:
    void BeginMinute(int64_t now);

    static constexpr int64_t kMinuteSec = 60;

    uint64_t perRule_;
    uint64_t forAll_;
    State state_;
};

} // namespace kelo::tool
