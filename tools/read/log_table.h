#pragma once

#include <string>
#include <vector>

#include "kelosyslog/failure.h"

namespace kelo::tool {

// The row shapes of log tables.
enum class TableKind {
    Logs,     // "logs"
    System,   // "general_log", "connection_log"
    Transfer, // "transfer_log"
};

// A table of a log database.
struct LogTable {
    std::string path; // absolute
    std::string name = "logs";
    TableKind kind = TableKind::Logs;
};

// The values of --db, --log, --table and --root; "" for an option that was not given.
struct LogTableOptions {
    std::string db;
    std::string log;
    std::string table;
    bool partial = false; // --partial
};

// The table to read: a file by its path (relative to the working folder), or a fixed log by its name, whose
// path is below `root`: "logs" for the working log, which is the default, and the names of the transfer
// logs, or else an archive in the folder of the archives by its file name, with or without ".db". Nothing is
// opened. Throws UsageError for an unknown log or table.
LogTable ResolveLogTable(const LogTableOptions &options, const std::string &root);

// Throws DatabaseError if the file at `path` describes a cluster, which `what` ("archive") cannot use.
void RequireDatabase(const std::string &path, const std::string &what);

// The folder of the archives below `root`.
std::string ArchiveFolderPath(const std::string &root);

// The names that --log knows apart from archives, and the same as a text, separated by commas.
std::vector<std::string> LogNames();
std::string KnownLogNames();

// One line with the path and the reason why it cannot be read (or changed, with `forWriting`): what can be
// seen from outside (missing, a folder, no permission, empty, not a database, cut short), or else what
// `failure` says (locked, damaged, no such table).
std::string DescribeDatabaseProblem(const LogTable &table, bool forWriting = false,
                                    const KELOFAILURE &failure = *SyslogFailureGet());

} // namespace kelo::tool
