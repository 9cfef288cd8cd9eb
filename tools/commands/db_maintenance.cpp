// kelosyslog db create, wal, limit, set-device, quarantine, reopen.

#include <sqlite3.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cctype>
#include <cerrno>
#include <cstring>
#include <filesystem>
#include <limits>
#include <memory>

#include "base/errors.h"
#include "base/files.h"
#include "base/folder_owner.h"
#include "base/sqlite.h"
#include "cli/confirm.h"
#include "cli/exit_status.h"
#include "commands/db_commands.h"
#include "keloplatform/errors.h"
#include "keloplatform/kelodb.h"
#include "kelosyslog/dbhandler.h"
#include "read/failure_reason.h"
#include "read/read_only_query.h"
#include "store/logs_schema.h"

namespace kelo::tool {
namespace {

namespace fs = std::filesystem;

struct CreateOptions : DbOptions {
    std::string schema;
};
struct LimitOptions : DbOptions {
    std::string kib;
};
struct DeviceOptions : DbOptions {
    std::string device;
};
struct QuarantineOptions : DbOptions {
    bool isConfirmed = false;
    bool isForced = false;
};

// The library passes its paths to a shell: the database's between double quotes, the schema's without.
void RequirePlainPaths(const std::string &path, const std::string &schema) {
    if (path.find_first_of("\"$`\\\n") != std::string::npos)
        throw UsageError("db create: '" + path +
                         "' holds one of \" $ ` \\, which the sqlite3 tool cannot be given");
    for (const char byte : schema) {
        if (std::isalnum(static_cast<unsigned char>(byte)) == 0 &&
            std::string_view("/._-+,:@%").find(byte) == std::string_view::npos &&
            static_cast<unsigned char>(byte) < 0x80)
            throw UsageError("--schema: '" + schema + "' holds '" + byte +
                             "'; use a path of letters, digits and /._-+,:@%");
    }
}

int Create(const CreateOptions &options) {
    const OutputFormat format = options.Format();
    const std::string path = options.Table().path;
    const std::string named = options.table.db.empty() ? path : fs::absolute(options.table.db).string();
    std::error_code error;
    const fs::file_status status = fs::symlink_status(named, error);
    if (status.type() == fs::file_type::none)
        throw DatabaseError("cannot create " + named + ": " + error.message());
    if (fs::exists(status)) {
        const bool leadsNowhere = fs::is_symlink(status) && !fs::exists(named, error);
        PrintMessage(named + (leadsNowhere ? " is a link to nothing" : " is there already") +
                     "; nothing created");
        return kExitNothing;
    }
    std::optional<TemporaryFile> shipped; // a file of its own, as the sqlite3 tool reads it
    std::string schema = options.schema;
    if (schema.empty()) {
        shipped.emplace((fs::temp_directory_path() / "kelosyslog-schema-XXXXXX").string(), kLogsSchema);
        schema = shipped->Path();
        // Whoever creates the database reads it.
        if (!shipped->IsWritten() || chmod(schema.c_str(), S_IRUSR | S_IRGRP | S_IROTH) != 0)
            throw DatabaseError("cannot create " + schema);
    }
    RequirePlainPaths(path, schema);
    if (access(schema.c_str(), R_OK) != 0)
        throw UsageError("--schema: cannot read " + schema);
    const std::string reason = AsOwnerOfFolder(
        path, [&] { return DBHandler(path, schema).DBCreate() == 0 ? std::string() : WhyFailed(path); });
    if (!reason.empty())
        throw DatabaseError("cannot create " + path + ": " + reason);
    const auto mode = ReadOnlyQuery(options.Table()).FirstRow("PRAGMA journal_mode", {"journal_mode"});
    KeyValues values;
    values.Add("created", path);
    values.Add("journal_mode", mode ? mode->front() : "");
    Print(values, format);
    return kExitFound;
}

int SetWal(const DbOptions &options) {
    const OutputFormat format = options.Format();
    const LogTable table = options.Table();
    const ReadOnlyQuery database(table);
    const auto mode = database.FirstRow("PRAGMA journal_mode=WAL", {"journal_mode"});
    if (!mode || mode->front() != "wal")
        throw DatabaseError(DescribeDatabaseProblem(table, true));
    const auto checkpoint = database.FirstRow("PRAGMA wal_checkpoint(TRUNCATE)", {"busy"});
    const bool isComplete = checkpoint && checkpoint->front() == "0";
    KeyValues values;
    values.Add("path", table.path);
    values.Add("journal_mode", mode->front());
    values.AddBool("checkpointed", isComplete);
    Print(values, format);
    if (!isComplete)
        PrintMessage(table.path + " is in use; its write-ahead log could not be emptied");
    return isComplete ? kExitFound : kExitNothing;
}

// Puts a fresh database in the place of a working log that is gone, so that it can be read before the first
// message. It belongs to the owner of the folder, who stores.
void BeginFresh(const LogTable &gone, const std::string &root) {
    struct stat folder {};
    if (gone.path != ResolveLogTable({}, root).path ||
        stat(fs::path(gone.path).parent_path().c_str(), &folder) != 0 ||
        (folder.st_uid != geteuid() && geteuid() != 0))
        return;
    const std::string reason = AsOwnerOfFolder(gone.path, [&] {
        DBHandler db(gone.path, root + "/usr/kelo/syslog/schema/logs.sql");
        return db.DBCreate() == 0 ? std::string() : WhyFailed(gone.path);
    });
    if (!reason.empty())
        PrintMessage("there is no fresh " + gone.path + " before the next message: " + reason);
}

int Limit(const LimitOptions &options) {
    const OutputFormat format = options.Format();
    const std::string path = options.Table().path;
    constexpr uint64_t kMost = std::numeric_limits<int32_t>::max();
    const auto limit = static_cast<int32_t>(ParseNumber("limit", options.kib, 0, kMost));
    struct stat before {};
    if (stat(path.c_str(), &before) != 0)
        throw DatabaseError(DescribeDatabaseProblem(options.Table()));
    if (SyslogngWorkingDbCheck(path, limit) != 0)
        throw DatabaseError("cannot examine " + path + ": it is no regular file");
    struct stat after {};
    const bool isRemoved = stat(path.c_str(), &after) != 0 || after.st_ino != before.st_ino;
    const bool isBeyond = before.st_size / 1024 > limit;
    if (isBeyond && !isRemoved)
        throw DatabaseError("cannot remove " + path);
    if (isRemoved)
        BeginFresh(options.Table(), *options.root);
    KeyValues values;
    values.Add("path", path);
    values.Add("size_kib", int64_t{before.st_size / 1024});
    values.Add("limit_kib", int64_t{limit});
    values.AddBool("removed", isRemoved);
    Print(values, format);
    return isRemoved ? kExitFound : kExitNothing;
}

int SetDevice(const DeviceOptions &options) {
    const OutputFormat format = options.Format();
    const LogTable table = options.Table();
    {
        const ReadOnlyQuery database(table);
        if (!database.HasTable("db_info") ||
            database.Number("SELECT count(*) AS value FROM db_info WHERE id = 1") == 0)
            throw DatabaseError(table.path + " has no row in a table db_info to write the device to");
    }
    DBHandler db(table.path, "");
    const bool isDone = db.DBCon() == 0 && db.DBInfoDevSet(db.DBCmdEscape(options.device)) == 0;
    db.DBDiscon();
    if (!isDone)
        throw DatabaseError("cannot change " + table.path + ": " + WhyFailed(table.path));
    KeyValues values;
    values.Add("path", table.path);
    values.Add("device", options.device);
    Print(values, format);
    return kExitFound;
}

bool IsSound(const LogTable &table) {
    try {
        return FindProblems(table).empty();
    } catch (const SqliteError &error) {
        if (error.code == SQLITE_CORRUPT || error.code == SQLITE_NOTADB)
            return false;
        throw;
    }
}

// The name under which a quarantine has put the file with this number: ".corrupt", or ".corrupt.1" and so on
// where an older one could not be renamed. Empty if it was not moved.
std::string FindMoved(const std::string &aside, ino_t inode) {
    std::string name = aside;
    for (int number = 1;; ++number) {
        struct stat status {};
        if (stat(name.c_str(), &status) != 0 && number > 1)
            return "";
        if (status.st_ino == inode)
            return name;
        name = aside + "." + std::to_string(number);
    }
}

int Quarantine(const QuarantineOptions &options) {
    const OutputFormat format = options.Format();
    const std::string path = options.Table().path;
    const std::string aside = path + ".corrupt";
    struct stat before {};
    if (stat(path.c_str(), &before) != 0 || !S_ISREG(before.st_mode))
        throw DatabaseError(DescribeDatabaseProblem(options.Table()));
    // Opened before the check, so that nothing but what was checked is moved: the check may take long, and
    // other processes may quarantine the database meanwhile.
    const std::unique_ptr<DBConnect_tag, decltype(&KELODBClose)> connection(
        KELODBConnect(nullptr, nullptr, nullptr, path.c_str()), &KELODBClose);
    if (!options.isForced && IsSound(options.Table())) {
        PrintMessage(path + " is sound; nothing moved (--force moves it nevertheless)");
        return kExitNothing;
    }
    if (!options.isConfirmed && !Confirm("db quarantine", "move " + path + " to " + aside)) {
        PrintMessage("nothing moved");
        return kExitNothing;
    }
    const bool isReloaded = DBErrorHandle_SQLITE_CORRUPT(connection.get(), path) == 0;
    const int moveError = errno;
    const std::string unsent = KELOErrorGet(); // the notification that comes before
    const std::string moved = FindMoved(aside, before.st_ino);
    if (moved.empty())
        throw DatabaseError("cannot move " + path + ": " +
                            (isReloaded       ? "it was replaced meanwhile"
                             : unsent.empty() ? std::strerror(moveError)
                                              : unsent));
    KeyValues values;
    values.Add("moved", path);
    values.Add("to", moved);
    values.AddBool("reloaded", isReloaded);
    Print(values, format);
    BeginFresh(options.Table(), *options.root);
    if (isReloaded)
        return kExitFound;
    PrintMessage("syslog-ng was not reloaded; if it stores into " + path +
                 ", it goes on in the moved file until you reload it");
    return kExitDatabase;
}

int Reopen(const DbOptions &options) {
    const OutputFormat format = options.Format();
    if (SyslogngHupSignalSend() != 0)
        throw DatabaseError(std::string("cannot make syslog-ng reopen its files: ") + KELOErrorGet());
    KeyValues values;
    values.AddBool("reloaded", true);
    Print(values, format);
    return kExitFound;
}

// A command with options of type `Options` that works on the database of --db.
template <typename Options>
Command Add(Program &program, Command db, const char *name, const char *description,
            std::shared_ptr<Options> options, int (*run)(const Options &)) {
    Command command =
        AddDbCommand(program, db, name, description, *options, [options, run] { return run(*options); });
    command.AddText("--db", options->table.db, "PATH", "This log database (default: the working log)");
    return command;
}

} // namespace

void AddDbMaintenance(Program &program, Command db) {
    auto create = std::make_shared<CreateOptions>();
    Add(program, db, "create", "Create a database, with its folder, that is not there yet", create, Create)
        .AddText("--schema", create->schema, "FILE",
                 "SQL that creates the tables (default: that of the working log)");
    Add(program, db, "wal", "Switch to write-ahead logging and empty the log into the database",
        std::make_shared<DbOptions>(), SetWal);
    auto limit = std::make_shared<LimitOptions>();
    Add(program, db, "limit",
        "Throw a working database away that is larger than KIB; syslog-ng begins a new one", limit, Limit)
        .AddText("kib", limit->kib, "", "The largest size that is kept, in KiB")
        .Required();
    auto device = std::make_shared<DeviceOptions>();
    Add(program, db, "set-device", "Write the device that an archive's logs came from", device, SetDevice)
        .AddText("device", device->device, "", "Name of the device")
        .Required();
    auto quarantine = std::make_shared<QuarantineOptions>();
    Command command = Add(program, db, "quarantine",
                          "Put a damaged database aside; syslog-ng begins a new one", quarantine, Quarantine);
    command.AddFlag("-y,--yes", quarantine->isConfirmed, "Do not ask");
    command.AddFlag("--force", quarantine->isForced, "Do not check that it is damaged");
    auto reopen = std::make_shared<DbOptions>();
    AddDbCommand(program, db, "reopen", "Make syslog-ng reopen its files", *reopen,
                 [reopen] { return Reopen(*reopen); });
}

} // namespace kelo::tool
