#pragma once

#include <span>
#include <vector>

#include "cluster/engine_row.h"
#include "cluster/engine_servers.h"

namespace kelo::tool {

// Stores blocks of rows on one server of a cluster so that each row is there once.
class BlockTransfer {
public:
    // `node` is the number of the log server of the rows.
    BlockTransfer(EngineServers &servers, unsigned int node) : servers_(servers), node_(node) {}

    // Waits until no server works on rows that another call has sent, which has ended.
    void AwaitOthers();

    // Stores what the cluster lacks of the rows on `server`, and compares number and checksums of all with
    // what it has then. The rows have ascending ids of their source that agree above kMessageMask. Returns
    // how many were sent. Throws DatabaseError, which names a row whose id another one has.
    uint64_t Store(size_t server, std::span<const EngineRow> rows);

private:
    struct Expected;
    std::vector<const EngineRow *> Missing(size_t server, const Expected &expected);
    std::vector<const EngineRow *> MissingOneByOne(size_t server, const Expected &expected);
    void Send(size_t server, std::vector<const EngineRow *> rows);
    void AwaitInserts(size_t server);

    EngineServers &servers_;
    unsigned int node_;
};

} // namespace kelo::tool
