#pragma once

#include <string_view>

#include "cli/program.h"

namespace kelo::tool {

// kelosyslog with its whole command line; if `only` is the name of a subcommand, with that one alone, which
// takes a third of the time.
struct KelosyslogProgram : Program {
    explicit KelosyslogProgram(std::string_view only = "");
};

// The subcommands, each in the file with its name.
void AddSearch(Program &program);
void AddCount(Program &program);
void AddDelete(Program &program);
void AddEvents(Program &program);
void AddReport(Program &program);
void AddValues(Program &program);
void AddStats(Program &program);
void AddRules(Program &program);
void AddNotify(Program &program);
void AddParse(Program &program);
void AddReceive(Program &program);
void AddDb(Program &program);
void AddArchive(Program &program);
void AddCluster(Program &program);
void AddRetention(Program &program);
void AddListen(Program &program);
void AddStatus(Program &program);

} // namespace kelo::tool
