#pragma once

#include <functional>
#include <memory>
#include <string>

#include "commands/common_options.h"

namespace kelo::tool {

// The command line of "kelosyslog events".
struct EventsOptions {
    std::string db;
    LogFilter filter;
    OutputOptions output;
    std::string lines;
    std::string offset;
    std::string idle;
    bool follow = false;
    std::function<int()> action; // of the subcommand below "events"; none to list
};
using SharedEventsOptions = std::shared_ptr<EventsOptions>;

// Adds a subcommand below "events". It inherits the options of "events". `action` is stored
// in `options` when the subcommand is chosen, so it must not own them.
Command AddEventsAction(Command events, const SharedEventsOptions &options, const std::string &name,
                        const std::string &description, std::function<int()> action);

// Throws UsageError if an option was given that only the list accepts, or with `withDb` --db.
void RefuseListOptions(const EventsOptions &options, const std::string &action, bool withDb);

// The subcommands that write: "add" and "clear-log".
void AddEventsAdd(Program &program, Command events, const SharedEventsOptions &options);
void AddEventsClearLog(Program &program, Command events, const SharedEventsOptions &options);

} // namespace kelo::tool
