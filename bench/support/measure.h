#pragma once

#include <functional>
#include <string>
#include <vector>

namespace kelo::bench {

// One way to do the work. `run` does it once and returns how long it took in milliseconds.
struct Variant {
    std::string name;
    std::function<double()> run;
};

// Milliseconds that `work` takes.
double Time(const std::function<void()> &work);

// Runs the variants in turn, `rounds` times after one round that does not count, so that whatever else the
// machine does meets all of them. Returns the median time of each, in milliseconds.
std::vector<double> MedianTimes(const std::vector<Variant> &variants, int rounds);

// Prints the heading of a table, or a row of it: a figure, its baseline, their ratio,
// and the most that the ratio may be. Returns whether it is kept.
void PrintHeading(const std::string &title, const std::string &unit);
bool PrintRatio(const std::string &name, double figure, const std::string &baseName, double base,
                double atMost);

// Ends the program with a message. For what a benchmark cannot go on without.
[[noreturn]] void Fail(const std::string &message);

} // namespace kelo::bench
