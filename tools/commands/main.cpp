// kelosyslog: searches and maintains the logs of a log server.

#include <csignal>

#include "cli/help_formatter.h"
#include "commands/commands.h"

int main(int argc, char **argv) {
    // A reader that goes away is noticed by the failing write.
    std::signal(SIGPIPE, SIG_IGN);

    kelo::tool::Program program;
    program.app.name("kelosyslog");
    program.app.description("Search and maintain the logs of a log server.");
    program.app.set_version_flag("--version", "kelosyslog " KELOSYSLOG_VERSION);
    program.app.formatter(std::make_shared<kelo::tool::HelpFormatter>());
    program.app.footer("'kelosyslog COMMAND --help' tells about one command; --root goes with each.\n\n"
                       "Exit status: 0 found or done, 1 nothing matched, 2 usage, 3 database, 4 output.");

    kelo::tool::AddSearch(program);
    kelo::tool::AddCount(program);
    kelo::tool::AddDelete(program);
    kelo::tool::AddEvents(program);
    kelo::tool::AddReport(program);
    kelo::tool::AddValues(program);
    kelo::tool::AddStats(program);
    kelo::tool::AddRules(program);
    kelo::tool::AddNotify(program);
    kelo::tool::AddParse(program);
    kelo::tool::AddReceive(program);
    kelo::tool::AddDb(program);
    kelo::tool::AddArchive(program);
    kelo::tool::AddStatus(program);
    return kelo::tool::RunProgram(program, argc, argv);
}
