#pragma once

#include <cstdint>
#include <functional>
#include <string>

namespace kelo::tool {

// Moves the rows of a cluster into a log database of SQLite.
//
// The rows of some seconds after the other are compared with those that the database has of these seconds, by
// their number and a sum of checksums, and then one by one; what is missing is stored in one transaction and
// compared again. So after a kill at any moment the same call goes on, rows that reach the cluster late are
// found by the next one, and rows that the database has besides stay.
struct ClusterExportOrder {
    std::string cluster;                                           // the description
    std::string database;                                          // of SQLite; created if it is missing
    std::function<void(uint64_t total, uint64_t done)> onProgress; // rows
};

struct ClusterExportResult {
    uint64_t rows = 0;   // of the cluster; all are in the database
    uint64_t stored = 0; // by this call
};

// Throws UsageError for a description that is none, DatabaseError and Interrupted.
ClusterExportResult ExportFromCluster(const ClusterExportOrder &order);

} // namespace kelo::tool
