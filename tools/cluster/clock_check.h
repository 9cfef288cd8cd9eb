#pragma once

#include <string>
#include <utility>
#include <vector>

#include "cluster/engine_servers.h"

namespace kelo::tool {

// How far the clock of a server may be ahead of this machine's, in seconds: between the two.
struct ClockOffset {
    double least = -1e9;
    double most = 1e9;
};

// The server says `second` in answer to a question of the time from `asked` to `answered` of this machine.
void Narrow(ClockOffset &offset, double asked, double second, double answered);

// Asks the servers for their time, several times in a second, as they give it in whole ones. One that does
// not answer stays unknown.
std::vector<ClockOffset> ClockOffsets(EngineServers &servers);

// The clocks that differ by more than a second from that of most, this machine's (0) included: their index
// and the difference in seconds.
std::vector<std::pair<size_t, double>> WrongClocks(const std::vector<ClockOffset> &offsets);

} // namespace kelo::tool
