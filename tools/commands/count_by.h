#pragma once

#include <string>
#include <vector>

#include "commands/common_options.h"
#include "read/log_reader.h"

namespace kelo::tool {

// The values of --by and --buckets; "" for an option that was not given.
struct CountByOptions {
    std::string by;
    std::string buckets;
};

// The columns that --by knows.
std::vector<std::string> CountedColumnNames();

// Prints the numbers of selected records by time or by a column, and by severity. `filter` is what
// `conditions` were made of, and gives the period. Returns an ExitStatus. Throws UsageError and
// DatabaseError.
int CountBy(const LogTable &table, const Conditions &conditions, const LogFilter &filter, int64_t now,
            const CountByOptions &options, OutputFormat format);

} // namespace kelo::tool
