#include "support/measure.h"

#include <algorithm>
#include <chrono>
#include <cstdio>
#include <cstdlib>

namespace kelo::bench {

double Time(const std::function<void()> &work) {
    const auto start = std::chrono::steady_clock::now();
    work();
    return std::chrono::duration<double, std::milli>(std::chrono::steady_clock::now() - start).count();
}

std::vector<double> MedianTimes(const std::vector<Variant> &variants, int rounds) {
    std::vector<std::vector<double>> times(variants.size());
    for (int round = 0; round <= rounds; ++round) {
        for (size_t i = 0; i < variants.size(); ++i) {
            const double time = variants[i].run();
            if (round > 0)
                times[i].push_back(time);
        }
    }
    std::vector<double> medians;
    for (std::vector<double> &samples : times) {
        const auto middle = samples.begin() + static_cast<std::ptrdiff_t>(samples.size() / 2);
        std::nth_element(samples.begin(), middle, samples.end());
        medians.push_back(*middle);
    }
    return medians;
}

void PrintHeading(const std::string &title, const std::string &unit) {
    std::printf(
        "\n### %s\n\n| what | %s | against | %s | ratio | at most | |\n|---|---|---|---|---|---|---|\n",
        title.c_str(), unit.c_str(), unit.c_str());
}

bool PrintRatio(const std::string &name, double figure, const std::string &baseName, double base,
                double atMost) {
    const double ratio = figure / base;
    const bool isKept = ratio <= atMost;
    std::printf("| %s | %.3f | %s | %.3f | %.2f | %.2f | %s |\n", name.c_str(), figure, baseName.c_str(),
                base, ratio, atMost, isKept ? "kept" : "MISSED");
    std::fflush(stdout);
    return isKept;
}

void Fail(const std::string &message) {
    std::fprintf(stderr, "%s\n", message.c_str());
    std::exit(2);
}

} // namespace kelo::bench
