#pragma once

#include <chrono>
#include <cstdio>

namespace kelo::bench {

template <typename Work>
double ElapsedMs(Work work) {
    const auto start = std::chrono::steady_clock::now();
    work();
    return std::chrono::duration<double, std::milli>(std::chrono::steady_clock::now() - start).count();
}

// The shorter of two times; 0 is "none yet".
inline double Best(double best, double elapsed) {
    return best == 0 || elapsed < best ? elapsed : best;
}

template <typename Work>
double BestOf(int runs, Work work) {
    double best = 0;
    while (runs-- > 0)
        best = Best(best, ElapsedMs(work));
    return best;
}

// Keeps the compiler from dropping the computation of `value`.
template <typename Value>
void Keep(const Value &value) {
    asm volatile("" : : "g"(&value) : "memory");
}

} // namespace kelo::bench
