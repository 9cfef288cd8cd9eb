// kelosyslog db index.

#include <sys/stat.h>

#include <cerrno>
#include <cstring>

#include "base/errors.h"
#include "cli/exit_status.h"
#include "commands/db_commands.h"
#include "keloplatform/skip_index.h"
#include "read/read_only_query.h"

namespace kelo::tool {
namespace {

constexpr const char *kFooter =
    "The index is the file PATH-skip beside a log database. By it a search for a keyword reads only the "
    "logs\n"
    "that may match. Searches build it in the background; removing it costs nothing but their speed.\n\n"
    "Exit status: 0 there is an index or it was removed, 1 there is none, 2 usage, 3 database, 4 output.";

struct IndexOptions : DbOptions {
    bool mustBuild = false;
    bool mustRemove = false;
};

void Build(const LogTable &table) {
    const std::string problem = "cannot build the index of " + table.path + ": ";
    switch (KELODBSkipIndexBuild(table.path.c_str(), 0)) {
    case KELODB_SKIP_NO_TABLE:
        throw DatabaseError(problem + "it has no table logs with ids of AUTOINCREMENT");
    case KELODB_SKIP_NOT_ALLOWED:
        throw DatabaseError(problem + table.path + "-skip cannot be written, or belongs to somebody else");
    case KELODB_SKIP_NO_ROOM:
        throw DatabaseError(problem + "the volume is nearly full");
    case KELODB_SKIP_SPARSE:
        throw DatabaseError(problem + "the database has few logs for the range of their ids");
    case KELODB_SKIP_BUSY:
        PrintMessage("another process builds the index");
        return;
    case KELODB_SKIP_FAILED:
        throw DatabaseError(problem + std::strerror(errno));
    default:
        return;
    }
}

int Remove(const LogTable &table, OutputFormat format) {
    const int result = KELODBSkipIndexRemove(table.path.c_str());
    if (result < 0)
        throw DatabaseError("cannot remove " + table.path + "-skip: " + std::strerror(errno));
    KeyValues values;
    values.Add("path", table.path);
    values.AddBool("removed", result == 0);
    Print(values, format);
    return result == 0 ? kExitFound : kExitNothing;
}

int Run(const IndexOptions &options) {
    const OutputFormat format = options.Format();
    const LogTable table = options.Table();
    if (options.mustBuild && options.mustRemove)
        throw UsageError("db index: --build and --remove exclude each other");
    if (options.mustRemove)
        return Remove(table, format);
    if (options.mustBuild) {
        const ReadOnlyQuery database(table); // names what is wrong with it
        Build(table);
    }
    const KELODBSkipIndex index = ReadOnlyQuery(table).SkipIndex();
    struct stat file {};
    const bool hasSize = stat(table.path.c_str(), &file) == 0 && file.st_size > 0;
    KeyValues values;
    values.Add("path", table.path);
    values.AddBool("index", index.isThere != 0);
    if (index.isThere != 0) {
        values.Add("first_id", index.firstId);
        values.Add("last_id", index.endId - 1);
        values.Add("index_bytes", index.diskBytes);
    }
    values.Add("newest_id", index.newestId);
    if (hasSize)
        values.Add("database_bytes", int64_t{file.st_size});
    Print(values, format);
    return index.isThere != 0 ? kExitFound : kExitNothing;
}

} // namespace

void AddDbIndex(Program &program, Command db) {
    auto options = std::make_shared<IndexOptions>();
    Command index =
        AddDbCommand(program, db, "index", "Tell what the index for keywords covers; build or remove it",
                     *options, [options] { return Run(*options); });
    index.Footer(kFooter);
    index.AddFlag("--build", options->mustBuild, "Bring it up to date");
    index.AddFlag("--remove", options->mustRemove, "Remove it");
    AddTableOptions(index, options->table, false);
}

} // namespace kelo::tool
