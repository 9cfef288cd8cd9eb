#include "cli/help_formatter.h"
#include "commands/commands.h"

namespace kelo::tool {

void DeclareCommandLine(Program &program) {
    program.app.name("kelosyslog");
    program.app.description("Search and maintain the logs of a log server.");
    program.app.set_version_flag("--version", "kelosyslog " KELOSYSLOG_VERSION);
    program.app.formatter(std::make_shared<HelpFormatter>());
    program.app.footer("'kelosyslog COMMAND --help' tells about one command; --root goes with each.\n\n"
                       "Exit status: 0 found or done, 1 nothing matched, 2 usage, 3 database, 4 output.");
    AddSearch(program);
    AddCount(program);
    AddDelete(program);
    AddEvents(program);
    AddReport(program);
    AddValues(program);
    AddStats(program);
    AddRules(program);
    AddNotify(program);
    AddParse(program);
    AddReceive(program);
    AddDb(program);
    AddArchive(program);
    AddStatus(program);
    AddRoot(program);
}

} // namespace kelo::tool
