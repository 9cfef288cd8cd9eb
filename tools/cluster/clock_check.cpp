#include "cluster/clock_check.h"

#include <algorithm>
#include <chrono>
#include <cstdlib>
#include <thread>

#include "cluster/server_answers.h"

namespace kelo::tool {
namespace {

constexpr int kRounds = 6; // which come to know an offset to a sixth of a second
constexpr double kMostSec = 1;

double Now() {
    return std::chrono::duration<double>(std::chrono::system_clock::now().time_since_epoch()).count();
}

double Middle(const ClockOffset &offset) {
    return (offset.least + offset.most) / 2;
}

} // namespace

void Narrow(ClockOffset &offset, double asked, double second, double answered) {
    offset.least = std::max(offset.least, second - answered);
    offset.most = std::min(offset.most, second + 1 - asked);
}

std::vector<ClockOffset> ClockOffsets(EngineServers &servers) {
    std::vector<ClockOffset> offsets(servers.Count());
    for (int round = 0; round < kRounds; ++round) {
        if (round > 0)
            std::this_thread::sleep_for(std::chrono::milliseconds(1000 / kRounds));
        for (size_t i = 0; i < offsets.size(); ++i) {
            try {
                const double asked = Now();
                const std::string second = AskOne(servers, i, "SELECT toInt64(toUnixTimestamp(now()))");
                Narrow(offsets[i], asked, std::strtod(second.c_str(), nullptr), Now());
            } catch (const DatabaseError &) {
                continue; // the other checks name it
            }
        }
    }
    return offsets;
}

std::vector<std::pair<size_t, double>> WrongClocks(const std::vector<ClockOffset> &offsets) {
    std::vector<ClockOffset> sorted = {{0, 0}};
    for (const ClockOffset &offset : offsets) {
        if (offset.most < ClockOffset{}.most)
            sorted.push_back(offset);
    }
    std::sort(sorted.begin(), sorted.end(),
              [](const ClockOffset &one, const ClockOffset &other) { return Middle(one) < Middle(other); });
    // One server has nothing but this machine's clock to be compared with.
    const ClockOffset usual = sorted.size() == 2 ? ClockOffset{0, 0} : sorted[sorted.size() / 2];
    std::vector<std::pair<size_t, double>> wrong;
    for (size_t i = 0; i < offsets.size(); ++i) {
        if (offsets[i].least - usual.most > kMostSec || usual.least - offsets[i].most > kMostSec)
            wrong.emplace_back(i, Middle(offsets[i]) - Middle(usual));
    }
    return wrong;
}

} // namespace kelo::tool
