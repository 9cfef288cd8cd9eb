// AccountingManager::LogInc at 1, 100 and 100,000 devices, against one increment in a hash map of the same
// names.

#include <algorithm>
#include <cstdint>
#include <numeric>
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

// Two loads, the second of which waits for the first, from random lines of so many bytes, beside a name that
// is read in order: what the caches and the translation of addresses cost a record at least, in ns.
double TwoLoadsTime(size_t bytes) {
    struct alignas(64) Line {
        size_t next = 0;
    };
    std::vector<Line> lines(bytes / sizeof(Line));
    std::vector<size_t> order(lines.size());
    std::iota(order.begin(), order.end(), size_t{0});
    std::shuffle(order.begin(), order.end(), std::mt19937(1));
    for (size_t i = 0; i < order.size(); ++i)
        lines[order[i]].next = order[(i + 1) % order.size()];
    const std::vector<std::string> senders = Senders(1);
    volatile size_t at = 0;
    const auto chase = [&] {
        size_t line = at;
        size_t sum = 0;
        for (const std::string &sender : senders) {
            line = lines[lines[line].next].next;
            sum += sender.size();
        }
        at = line + (sum == 0 ? 1 : 0);
    };
    return MedianTimes({{"loads", [&] { return Time(chase); }}}, kRounds)[0] * kNsPerMs / kLogs;
}

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
    // Flat: what many devices cost more, they cost the map too, in caches. Its loop is so short that the
    // processor works on several names at once and waits for their lines together; LogInc, a function that
    // also asks for the time, mostly waits for one name after the other. So it is measured against that wait
    // too: a slot of the table, 8 bytes of 2 MiB, and then the device, one of 100,000 lines.
    PrintHeading("Counting a log with 100000 devices, in the times of 1 device", "times");
    allKept = PrintRatio("LogInc", figures[2].logInc / figures[0].logInc, "increment in std::unordered_map",
                         figures[2].increment / figures[0].increment, 1.25) &&
              allKept;
    constexpr size_t kLine = 64;
    constexpr size_t kSlots = size_t{2} << 20;
    PrintHeading("What 100000 devices cost more than 1", "ns");
    return PrintRatio("LogInc", figures[2].logInc - figures[0].logInc, "two loads in a row",
                      TwoLoadsTime(kSlots + size_t{kDeviceCounts[2]} * kLine), 1.25) &&
                   allKept
               ? 0
               : 1;
}
