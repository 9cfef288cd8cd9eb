#pragma once

#include <cstdint>
#include <functional>
#include <string>

namespace kelo::tool {

// Moves the rows of a log database of SQLite into a cluster.
//
// A row's id in the cluster follows from its second, the number of the log server that the rows are given
// (`node`), and its id in the database. So what is missing in the cluster is found by comparing blocks of
// rows with what the cluster has: their number and a sum of checksums. Only what is missing is sent, and each
// block is read back and compared. Nothing else is kept: after a kill at any moment the same call goes on,
// and one more finds that all is there.
struct ClusterImportOrder {
    std::string database; // of SQLite, with a table "logs"; may get records meanwhile, which are left out
    std::string cluster;  // the description, of a user who may insert
    unsigned int node = 0;
    std::function<void(uint64_t total, uint64_t done)> onProgress; // ids
};

struct ClusterImportResult {
    uint64_t rows = 0;       // of the database; all are in the cluster
    uint64_t sent = 0;       // by this call
    uint64_t nulls = 0;      // values that were NULL and are empty texts, or the time 0, in the cluster
    uint64_t wrongTimes = 0; // values of utcsec that were no whole numbers, and are as SQLite converts them
};

// Throws UsageError for a description that is none, DatabaseError when a row cannot be stored or has not
// arrived, and Interrupted.
ClusterImportResult ImportIntoCluster(const ClusterImportOrder &order);

} // namespace kelo::tool
