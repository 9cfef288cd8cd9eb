#include "commands/commands.h"

namespace kelo::tool {

KelosyslogProgram::KelosyslogProgram()
    : Program("kelosyslog", "Search and maintain the logs of a log server.", KELOSYSLOG_VERSION) {
    Top().Footer("'kelosyslog COMMAND --help' tells about one command; --root goes with each.\n\n"
                 "Exit status: 0 found or done, 1 nothing matched, 2 usage, 3 database, 4 output.");
    AddSearch(*this);
    AddCount(*this);
    AddDelete(*this);
    AddEvents(*this);
    AddReport(*this);
    AddValues(*this);
    AddStats(*this);
    AddRules(*this);
    AddNotify(*this);
    AddParse(*this);
    AddReceive(*this);
    AddDb(*this);
    AddArchive(*this);
    AddRetention(*this);
    AddListen(*this);
    AddStatus(*this);
    AddCommonOptions(*this);
}

} // namespace kelo::tool
