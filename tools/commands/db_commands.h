#pragma once

#include <string>
#include <vector>

#include "commands/common_options.h"
#include "print/key_values.h"

namespace kelo::tool {

// The options of every command of "kelosyslog db".
struct DbOptions {
    LogTableOptions table;
    std::string format = "text";
    const std::string *root = nullptr; // --root, known once the command line was read

    LogTable Table() const {
        LogTable resolved = ResolveLogTable(table, *root);
        RequireDatabase(resolved.path, "db");
        return resolved;
    }
    OutputFormat Format() const { return ParseKeyValuesFormat(format); }
};

// Adds a command of "kelosyslog db" with these options.
Command AddDbCommand(Program &program, Command db, const std::string &name, const std::string &description,
                     DbOptions &options, std::function<int()> run);

// What a check of the whole database finds, a line each; empty for a sound one. Throws DatabaseError: a
// SqliteError where SQLite cannot go on, for example with the code of a damaged file.
std::vector<std::string> FindProblems(const LogTable &table);

// Commands that only read: info, check.
void AddDbInspection(Program &program, Command db);
// Commands that change a database: create, wal, limit, set-device, quarantine, reopen.
void AddDbMaintenance(Program &program, Command db);
// index.
void AddDbIndex(Program &program, Command db);

} // namespace kelo::tool
