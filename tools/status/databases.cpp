#include "status/databases.h"

#include <sqlite3.h>
#include <sys/stat.h>

#include <algorithm>
#include <ctime>
#include <filesystem>
#include <limits>

#include "base/number_text.h"
#include "kelosyslog/records.h"
#include "read/accounting_samples.h"
#include "read/event_log.h"
#include "read/read_only_query.h"

namespace kelo::tool {
namespace {

namespace fs = std::filesystem;

using State = DatabaseStatus::State;
using Row = ReadOnlyQuery::Row;

constexpr std::chrono::milliseconds kAskPatience{150};
constexpr int64_t kMostCounted = 100'000; // rows; counting them takes a few milliseconds
constexpr const char *kArchives = "/var/log/kelosyslog/archive";

std::optional<int64_t> SizeOf(const std::string &path) {
    struct stat status {};
    return stat(path.c_str(), &status) == 0 ? std::optional<int64_t>(status.st_size) : std::nullopt;
}

std::optional<int64_t> NumberOf(const std::string &text) {
    return text.empty() ? std::nullopt : std::optional<int64_t>(SignedNumber(text));
}

// The moment of a local date and time, "2020/01/02 10:11:12".
std::optional<int64_t> LocalMoment(const std::string &text) {
    tm parts{};
    if (strptime(text.c_str(), "%Y/%m/%d %H:%M:%S", &parts) == nullptr)
        return std::nullopt;
    parts.tm_isdst = -1;
    return std::mktime(&parts);
}

// The row numbers are read at both ends of the table. If many are between them, the rows are not counted:
// that would read a whole index.
void ReadRows(const ReadOnlyQuery &database, DatabaseStatus &status) {
    const auto ends = database.FirstRow("SELECT (SELECT min(rowid) FROM " + status.table +
                                            ") AS low, (SELECT max(rowid) FROM " + status.table + ") AS high",
                                        {"low", "high"});
    if (!ends || ends->front().empty()) {
        status.rows = 0;
        return;
    }
    constexpr auto kMost = static_cast<uint64_t>(std::numeric_limits<int64_t>::max());
    const uint64_t distance =
        static_cast<uint64_t>(*NumberOf(ends->back())) - static_cast<uint64_t>(*NumberOf(ends->front()));
    const auto span = static_cast<int64_t>(std::min(distance, kMost - 1)) + 1;
    status.isEstimate = span > kMostCounted;
    status.rows = status.isEstimate ? span : database.Number("SELECT count(*) AS value FROM " + status.table);
}

// Transfer logs have no index of times: their first and last row are read.
void ReadTransferTimes(const ReadOnlyQuery &database, DatabaseStatus &status) {
    for (const char *order : {"ASC", "DESC"}) {
        const auto row = database.FirstRow("SELECT ldate || ' ' || ltime AS moment FROM " + status.table +
                                               " ORDER BY rowid " + order + " LIMIT 1",
                                           {"moment"});
        (*order == 'A' ? status.first : status.last) = row ? LocalMoment(row->front()) : std::nullopt;
    }
}

void ReadTimes(const ReadOnlyQuery &database, DatabaseStatus &status) {
    const std::string column = status.table == "eps" ? "stamp" : status.table == "log" ? "time" : "utcsec";
    // Each of the two uses one end of the index.
    const auto row =
        database.FirstRow("SELECT (SELECT min(" + column + ") FROM " + status.table +
                              ") AS first, (SELECT max(" + column + ") FROM " + status.table + ") AS last",
                          {"first", "last"});
    status.first = row ? NumberOf(row->front()) : std::nullopt;
    status.last = row ? NumberOf(row->back()) : std::nullopt;
}

void ReadIndex(const ReadOnlyQuery &database, DatabaseStatus &status) {
    const KELODBSkipIndex index = database.SkipIndex();
    if (index.isThere == 0)
        return;
    status.indexSize = index.diskBytes;
    status.unindexed = index.newestId + 1 - index.endId;
}

State StateAfter(int code) {
    if (code == SQLITE_BUSY || code == SQLITE_LOCKED || code == SQLITE_INTERRUPT)
        return State::Locked;
    return code == SQLITE_CORRUPT || code == SQLITE_NOTADB ? State::Damaged : State::Unreadable;
}

void Read(DatabaseStatus &status) {
    try {
        const ReadOnlyQuery database({status.path, status.table}, kAskPatience);
        database.RequireTable();
        if (status.table == "logs" && status.size > 0 &&
            database.Number("SELECT count(*) AS value FROM sqlite_master") == 0) {
            status.rows = 0; // syslog-ng creates the table with the first message
            return;
        }
        ReadRows(database, status);
        ReadIndex(database, status);
        try {
            if (status.table == "transfer_log")
                ReadTransferTimes(database, status);
            else
                ReadTimes(database, status);
        } catch (const SqliteError &error) {
            if (error.code != SQLITE_INTERRUPT) // a table without its index
                throw;
        }
    } catch (const SqliteError &error) {
        status.state = StateAfter(error.code);
        status.problem = status.size == 0 ? status.path + ": the file is empty" : error.what();
    } catch (const DatabaseError &error) {
        status.state = State::Unreadable;
        status.problem = error.what();
    }
}

DatabaseStatus Look(const std::string &name, const std::string &path, const std::string &table) {
    DatabaseStatus status;
    status.name = name;
    status.path = path;
    status.table = table;
    status.quarantined = SizeOf(path + ".corrupt");
    struct stat file {};
    if (stat(path.c_str(), &file) != 0 && (errno == ENOENT || errno == ENOTDIR)) {
        status.state = State::Missing;
        status.problem = path + ": no such file";
        return status;
    }
    status.size = file.st_size;
    status.walSize = SizeOf(path + "-wal").value_or(0);
    Read(status);
    return status;
}

} // namespace

std::vector<DatabaseStatus> GatherDatabases(const std::string &root, const std::vector<std::string> &others) {
    std::vector<DatabaseStatus> all;
    all.push_back(Look("logs", ResolveLogTable({}, root).path, "logs"));
    for (int32_t i = 0; i < g_xferlog_info_count - 1; ++i) {
        const std::string name = g_xferlog_info[i].name;
        const std::string path = ResolveLogTable({"", name, ""}, root).path;
        if (SizeOf(path) || SizeOf(path + ".corrupt"))
            all.push_back(Look(name, path, "transfer_log"));
    }
    all.push_back(Look("accounting", AccountingPath("", root), "eps"));
    all.push_back(Look("events", EventDatabasePath("", root), "log"));
    for (const std::string &path : others) {
        const auto isPath = [&](const DatabaseStatus &known) { return known.path == path; };
        if (std::none_of(all.begin(), all.end(), isPath))
            all.push_back(Look("receive", path, "logs"));
    }
    return all;
}

ArchiveStatus GatherArchives(const std::string &root) {
    ArchiveStatus status;
    status.path = root + kArchives;
    std::error_code error;
    for (fs::directory_iterator at(status.path, error), end; !error && at != end; at.increment(error)) {
        if (at->path().extension() != ".db")
            continue;
        ++status.files;
        status.size += SizeOf(at->path()).value_or(0);
    }
    if (error && error != std::errc::no_such_file_or_directory)
        status.problem = status.path + ": " + error.message();
    return status;
}

} // namespace kelo::tool
