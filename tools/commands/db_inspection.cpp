// kelosyslog db info, check.

#include <sys/stat.h>

#include <condition_variable>
#include <fstream>
#include <mutex>
#include <thread>

#include "base/errors.h"
#include "base/number_text.h"
#include "base/time_format.h"
#include "cli/exit_status.h"
#include "cli/progress_bar.h"
#include "commands/db_commands.h"
#include "kelosyslog/dbutil.h"
#include "read/read_only_query.h"

namespace kelo::tool {
namespace {

int64_t SizeOf(const std::string &path) {
    struct stat status {};
    return stat(path.c_str(), &status) == 0 ? status.st_size : 0;
}

void AddTime(KeyValues &values, const std::string &name, const std::string &utcsec) {
    if (utcsec.empty())
        values.AddUnknown(name);
    else
        values.Add(name, TimeFormat(false).Iso(SignedNumber(utcsec)));
}

// The time of the first record in one order of time; "" when there is none.
std::string FirstTime(const ReadOnlyQuery &database, const char *direction) {
    const auto row = database.FirstRow(
        std::string("SELECT utcsec FROM logs ORDER BY utcsec ") + direction + " LIMIT 1", {"utcsec"});
    return row ? row->front() : "";
}

void AddDescription(KeyValues &values, const ReadOnlyQuery &database) {
    if (!database.HasTable("db_info"))
        return;
    const auto row =
        database.FirstRow("SELECT * FROM db_info", {"start_time", "end_time", "log_count", "device"});
    if (!row)
        return;
    AddTime(values, "db_info_start_time", row->at(0));
    AddTime(values, "db_info_end_time", row->at(1));
    values.Add("db_info_log_count", SignedNumber(row->at(2)));
    values.Add("db_info_device", row->at(3));
}

int Info(const DbOptions &options) {
    const OutputFormat format = options.Format();
    const LogTable table = options.Table();
    const ReadOnlyQuery database(table);
    const auto mode = database.FirstRow("PRAGMA journal_mode", {"journal_mode"});
    KeyValues values;
    values.Add("path", table.path);
    values.Add("size_bytes", SizeOf(table.path));
    values.Add("wal_bytes", SizeOf(table.path + "-wal"));
    values.Add("generation", int64_t{SyslogDBVersionGet(table.path)});
    values.Add("journal_mode", mode ? mode->front() : "");
    if (!database.HasTable(table.name))
        throw DatabaseError(table.path + ": no table " + table.name);
    values.Add("rows", database.Number("SELECT count(*) AS value FROM " + table.name));
    if (table.kind == TableKind::Logs) {
        AddTime(values, "first_log", FirstTime(database, "ASC"));
        AddTime(values, "last_log", FirstTime(database, "DESC"));
    }
    AddDescription(values, database);
    Print(values, format);
    return kExitFound;
}

// Bytes that the process has read from files so far.
uint64_t BytesRead() {
    std::ifstream io("/proc/self/io");
    std::string name;
    uint64_t bytes = 0;
    io >> name >> bytes; // "rchar: 123"
    return bytes;
}

// Shows the progress of a check while the calling thread runs it. SQLite reports no progress, so it is
// estimated from the bytes that were read: a check reads every page, and most of them a second time for the
// rows.
class CheckProgress {
public:
    explicit CheckProgress(int64_t databaseBytes)
        : bar_(2 * static_cast<uint64_t>(databaseBytes)),
          watcher_([this](std::stop_token stop) { Watch(stop); }) {}

private:
    void Watch(std::stop_token stop) {
        std::unique_lock lock(mutex_);
        for (uint64_t before = BytesRead();;) {
            if (wake_.wait_for(lock, stop, std::chrono::seconds(1), [] { return false; }) ||
                stop.stop_requested())
                return;
            const uint64_t now = BytesRead();
            bar_.Add(now - before);
            before = now;
        }
    }

    ProgressBar bar_;
    std::mutex mutex_;
    std::condition_variable_any wake_;
    std::jthread watcher_; // ends first
};

int Check(const DbOptions &options) {
    const OutputFormat format = options.Format();
    const LogTable table = options.Table();
    const std::vector<std::string> problems = FindProblems(table);
    KeyValues values;
    values.Add("path", table.path);
    values.AddBool("sound", problems.empty());
    values.AddList("problems", problems);
    Print(values, format);
    return problems.empty() ? kExitFound : kExitDatabase;
}

} // namespace

std::vector<std::string> FindProblems(const LogTable &table) {
    const ReadOnlyQuery database(table);
    // Opening succeeds with any file: this reads its head.
    database.FirstRow("PRAGMA schema_version", {});
    const CheckProgress progress(SizeOf(table.path) + SizeOf(table.path + "-wal"));
    std::vector<std::string> lines = database.Column("PRAGMA integrity_check", "integrity_check");
    if (lines == std::vector<std::string>{"ok"})
        lines.clear();
    return lines;
}

void AddDbInspection(Program &program, Command db) {
    auto infoOptions = std::make_shared<DbOptions>();
    Command info = AddDbCommand(program, db, "info", "Tell size, journal mode, rows and times of a database",
                                *infoOptions, [infoOptions] { return Info(*infoOptions); });
    AddTableOptions(info, infoOptions->table, false);

    auto checkOptions = std::make_shared<DbOptions>();
    Command check =
        AddDbCommand(program, db, "check", "Check every page and row of a database; changes nothing",
                     *checkOptions, [checkOptions] { return Check(*checkOptions); });
    AddTableOptions(check, checkOptions->table, false);
}

} // namespace kelo::tool
