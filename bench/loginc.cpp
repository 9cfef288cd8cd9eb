// AccountingManager::LogInc at 1, 100 and 100,000 devices, against one increment in a hash map of the same
// names.

#include <algorithm>
#include <cstdint>
#include <random>
#include <string>
#include <unordered_map>
#include <vector>

#include "kelosyslog/accounting.h"
#include "kelosyslog/root.h"
#include "support/account_database.h"
#include "support/folder.h"
#include "support/measure.h"

using namespace kelo::bench;

namespace {

constexpr int kDeviceCounts[] = {1, 100, 100000};
constexpr int kLogs = 1000000; // in a round
constexpr int kRounds = 9;
constexpr double kNsPerMs = 1e6;

// The senders of a round's logs, each device equally often, in an order that no cache foresees.
std::vector<std::string> Senders(int devices) {
    std::vector<std::string> senders(kLogs);
    for (int i = 0; i < kLogs; ++i)
        senders[static_cast<size_t>(i)] = DeviceName(i % devices);
    std::shuffle(senders.begin(), senders.end(), std::mt19937(1));
    return senders;
}

struct Figures {
    double logInc; // ns
    double increment;
};

Figures Measure(int devices) {
    const std::vector<std::string> senders = Senders(devices);
    AccountingManager accounting;
    std::unordered_map<std::string, uint64_t> counts;
    const auto times = MedianTimes({{"LogInc",
                                     [&] {
                                         return Time([&] {
                                             for (const std::string &sender : senders)
                                                 accounting.LogInc(sender);
                                         });
                                     }},
                                    {"map",
                                     [&] {
                                         return Time([&] {
                                             for (const std::string &sender : senders)
                                                 ++counts[sender];
                                         });
                                     }}},
                                   kRounds);
    if (counts.size() != accounting.HistogramGet().size())
        Fail("LogInc and the map saw different devices");
    return {times[0] * kNsPerMs / kLogs, times[1] * kNsPerMs / kLogs};
}

} // namespace

int main() {
    const Folder folder("bench-loginc");
    SyslogRootSet(folder.Path());
    CreateAccountDatabase(folder.Path());

    PrintHeading("Counting a log", "ns");
    std::vector<Figures> figures;
    bool allKept = true;
    for (const int devices : kDeviceCounts) {
        figures.push_back(Measure(devices));
        allKept = PrintRatio("LogInc, " + std::to_string(devices) + " devices", figures.back().logInc,
                             "increment in std::unordered_map", figures.back().increment, 3) &&
                  allKept;
    }
    // Flat: what many devices cost more, they cost the map too, in caches.
    PrintHeading("Counting a log with 100000 devices, in the times of 1 device", "times");
    return PrintRatio("LogInc", figures[2].logInc / figures[0].logInc, "increment in std::unordered_map",
                      figures[2].increment / figures[0].increment, 1.25) &&
                   allKept
               ? 0
               : 1;
}
