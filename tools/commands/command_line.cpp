#include "commands/commands.h"

#include <algorithm>

namespace kelo::tool {
namespace {

struct Subcommand {
    std::string_view name;
    void (*add)(Program &);
};
constexpr Subcommand kSubcommands[] = {
    {"search", AddSearch},   {"count", AddCount},     {"delete", AddDelete},       {"events", AddEvents},
    {"report", AddReport},   {"values", AddValues},   {"stats", AddStats},         {"rules", AddRules},
    {"notify", AddNotify},   {"parse", AddParse},     {"receive", AddReceive},     {"db", AddDb},
    {"archive", AddArchive}, {"cluster", AddCluster}, {"retention", AddRetention}, {"listen", AddListen},
    {"status", AddStatus},
};

} // namespace

KelosyslogProgram::KelosyslogProgram(std::string_view only)
    : Program("kelosyslog", "Search and maintain the logs of a log server.", KELOSYSLOG_VERSION) {
    Top().Footer("'kelosyslog COMMAND --help' tells about one command; --root goes with each.\n\n"
                 "Exit status: 0 found or done, 1 nothing matched, 2 usage, 3 database, 4 output.");
    const bool isKnown = std::any_of(std::begin(kSubcommands), std::end(kSubcommands),
                                     [&](const Subcommand &subcommand) { return only == subcommand.name; });
    for (const Subcommand &subcommand : kSubcommands) {
        if (!isKnown || only == subcommand.name)
            subcommand.add(*this);
    }
    AddCommonOptions(*this);
}

} // namespace kelo::tool
