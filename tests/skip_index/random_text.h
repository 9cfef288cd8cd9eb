#pragma once

#include <random>
#include <string>
#include <string_view>

namespace kelo::test {

// Chance that can be repeated.
class Random {
public:
    explicit Random(uint64_t seed) : engine_(seed) {}
    // A number from 0 to `count` - 1.
    size_t Below(size_t count) { return std::uniform_int_distribution<size_t>(0, count - 1)(engine_); }
    bool OneIn(size_t count) { return Below(count) == 0; }
    template <typename Texts>
    auto &Of(Texts &texts) {
        return texts[Below(std::size(texts))];
    }

private:
    std::mt19937_64 engine_;
};

inline constexpr std::string_view kWords[] = {
    "connection", "closed",    "Error",  "error",    "disk", "Disk full",   "sshd",   "Segfault", "kernel",
    "timeout",    "user=root", "[ufw",   "100%",     "a_b",  "c:\\windows", "it's",   "café",     "CAFÉ",
    "secret",     "kelvin",    "日本語", "/var/log", "x*y",  "what?",       "failed", "denied",   "]x[",
    "\"quoted\"", "-minus",    "OR",     "\x01\x02", "aaaa", "aaaaaaaa",    "the",    "ABCD",     "abcd"};
// Words with bytes that are not UTF-8, and some that SQLite or RE2 finds as these.
inline constexpr std::string_view kFoundInOddWords[] = {"abcd", "secret", "kelvin", "denied"};
inline constexpr std::string_view kOddWords[] = {"a\xc1\242cd",     "A\xc1\202CD",        "ſecret",  "Kelvin",
                                                 "\xff\xfe secret", "\xed\xa0\200denied", "sshd\xe9"};

} // namespace kelo::test
