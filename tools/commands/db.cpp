// kelosyslog db: creates, inspects and maintains one log database.

#include "commands/commands.h"
#include "commands/db_commands.h"

namespace kelo::tool {
namespace {

constexpr const char *kFooter =
    "'kelosyslog db COMMAND --help' tells about one of them.\n\n"
    "Examples:\n"
    "  kelosyslog db info\n"
    "  kelosyslog db check --db /volume1/old.db -o json\n"
    "  kelosyslog db limit 1048576\n\n"
    "Exit status: 0 done, 1 nothing was to be done or not confirmed, 2 usage, 3 database, 4 output.";

} // namespace

Command AddDbCommand(Program &program, Command db, const std::string &name, const std::string &description,
                     DbOptions &options, std::function<int()> run) {
    Command command = AddSubcommand(program, db, name, description, std::move(run));
    options.root = &program.root;
    AddKeyValuesFormat(command, options.format);
    return command;
}

void AddDb(Program &program) {
    Command db = program.Top().AddBelow("db", "Create, inspect and maintain a log database");
    db.NeedBelow(1, 1);
    db.Footer(kFooter);
    AddDbInspection(program, db);
    AddDbMaintenance(program, db);
    AddDbIndex(program, db);
}

} // namespace kelo::tool
