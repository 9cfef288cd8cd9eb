#include "read/log_table.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <array>
#include <cerrno>
#include <cstdint>
#include <cstring>
#include <filesystem>
#include <string_view>

#include "base/errors.h"
#include "base/files.h"
#include "keloplatform/cluster.h"
#include "kelosyslog/records.h"
#include "read/failure_reason.h"

namespace kelo::tool {
namespace {

constexpr const char *kWorkingLog = "logs";
constexpr const char *kWorkingLogPath = "/var/log/kelosyslog/logs.db";
constexpr size_t kHeaderSize = 100;
using Header = std::array<uint8_t, kHeaderSize>;

TableKind KindOf(const std::string &table) {
    if (table == "logs")
        return TableKind::Logs;
    if (table == "general_log" || table == "connection_log")
        return TableKind::System;
    if (table == "transfer_log")
        return TableKind::Transfer;
    throw UsageError("--table: '" + table +
                     "' is no log table; tables are logs, general_log, connection_log, transfer_log");
}

// The header of a file; the number of bytes that were read, or -1 with errno set.
ssize_t ReadHeader(const std::string &path, Header &header) {
    // Not blocking: the path may name a pipe.
    const FileHandle file(open(path.c_str(), O_RDONLY | O_CLOEXEC | O_NONBLOCK));
    return file ? read(file.Get(), header.data(), header.size()) : -1;
}

bool IsShorterThanItSays(const Header &header, int64_t fileSize) {
    const auto byte = [&](size_t i) { return static_cast<int64_t>(header[i]); };
    const int64_t pageSize = (byte(16) << 8 | byte(17)) == 1 ? 65536 : byte(16) << 8 | byte(17);
    const int64_t pages = byte(28) << 24 | byte(29) << 16 | byte(30) << 8 | byte(31);
    return pages * pageSize > fileSize;
}

// Whether it holds a header only: syslog-ng opens a fresh file at once, and creates the table with the first
// message.
bool IsFresh(const std::string &path, const Header &header) {
    struct stat log {};
    const bool hasLog = stat((path + "-wal").c_str(), &log) == 0 && log.st_size > 0;
    return !hasLog && header[28] == 0 && header[29] == 0 && header[30] == 0 && header[31] == 1;
}

// Whoever may write to the folder creates the index.
bool HasLogWithoutIndex(const std::string &path) {
    struct stat status {};
    return stat((path + "-wal").c_str(), &status) == 0 && status.st_size > 0 &&
           access((path + "-shm").c_str(), F_OK) != 0;
}

// "" when there is none to be seen.
std::string ReasonFromOutside(const LogTable &table, bool forWriting) {
    struct stat status {};
    if (stat(table.path.c_str(), &status) != 0)
        return errno == ENOENT ? "no such file" : std::strerror(errno);
    if (S_ISDIR(status.st_mode))
        return "it is a folder";
    if (!S_ISREG(status.st_mode))
        return "it is no regular file";
    Header header{};
    const ssize_t size = ReadHeader(table.path, header);
    if (size < 0)
        return std::strerror(errno);
    if (size == 0)
        return "the file is empty";
    if (KELODBIsCluster(table.path.c_str()) != 0)
        return "";
    constexpr std::string_view kMagic("SQLite format 3\0", 16);
    if (std::memcmp(header.data(), kMagic.data(), kMagic.size()) != 0)
        return "it is not an SQLite database (or an encrypted one)";
    if (size < static_cast<ssize_t>(kHeaderSize) || IsShorterThanItSays(header, status.st_size))
        return "the file is cut short";
    if (!forWriting && IsFresh(table.path, header))
        return "it has no table yet: the first record creates it";
    const std::string folder = std::filesystem::path(table.path).parent_path().string();
    if (forWriting && (access(table.path.c_str(), W_OK) != 0 || access(folder.c_str(), W_OK) != 0))
        return "no permission to write to it and its folder";
    if (access(folder.c_str(), W_OK) != 0 && HasLogWithoutIndex(table.path))
        return "its write-ahead log cannot be read without " + table.path +
               "-shm, which is missing; syslog-ng creates it, or any reading by root";
    return "";
}

// The failure may be an older one, of another file.
std::string ReasonFromInside(const LogTable &table, const KELOFAILURE &failure) {
    const bool isOfTable = failure.kind == KELO_FAILURE_TABLE || failure.kind == KELO_FAILURE_COLUMN;
    if (isOfTable || failure.path != table.path)
        return "no usable table '" + table.name + "' in it" +
               (isOfTable ? std::string(" (") + failure.text + ")" : "");
    return WhyFailed(table.path, failure);
}

// Throws UsageError when there is no archive of this name.
std::string ArchivePath(const std::string &name, const std::string &root) {
    const std::string folder = ArchiveFolderPath(root);
    const bool isPlain = name.find('/') == std::string::npos && name.front() != '.';
    for (const char *suffix : {"", ".db"}) {
        std::error_code error;
        std::string path = folder + "/" + name + suffix;
        if (isPlain && std::filesystem::is_regular_file(path, error))
            return path;
    }
    throw UsageError("--log: unknown log '" + name + "'; logs are " + KnownLogNames() +
                     ", and the archives that 'kelosyslog archive --list' lists");
}

} // namespace

LogTable ResolveLogTable(const LogTableOptions &options, const std::string &root) {
    if (!options.db.empty() && !options.log.empty())
        throw UsageError("--log: goes not together with --db");
    LogTable table;
    if (!options.db.empty()) {
        table.path = FollowLinks(options.db);
    } else if (options.log.empty() || options.log == kWorkingLog) {
        table.path = FollowLinks(root + kWorkingLogPath);
    } else {
        const std::string path = XferlogDBPathGet(options.log.c_str());
        table.path = path.empty() ? ArchivePath(options.log, root) : root + path;
        if (!path.empty())
            table.name = "transfer_log";
    }
    if (!options.table.empty())
        table.name = options.table;
    table.kind = KindOf(table.name);
    if (options.partial && KELODBIsCluster(table.path.c_str()) == 0)
        throw UsageError("--partial: " + table.path + " does not describe a cluster");
    KELODBClusterPartialSet(options.partial ? 1 : 0);
    return table;
}

void RequireDatabase(const std::string &path, const std::string &what) {
    if (KELODBIsCluster(path.c_str()) != 0)
        throw DatabaseError(path + " describes a cluster: " + what + " needs a database of SQLite");
}

std::string ArchiveFolderPath(const std::string &root) {
    return root + "/var/log/kelosyslog/archive";
}

std::vector<std::string> LogNames() {
    std::vector<std::string> names = {kWorkingLog};
    for (int32_t i = 0; i < g_xferlog_info_count - 1; ++i)
        names.emplace_back(g_xferlog_info[i].name);
    return names;
}

std::string KnownLogNames() {
    std::string text;
    for (const std::string &name : LogNames())
        text += (text.empty() ? "" : ", ") + name;
    return text;
}

std::string DescribeDatabaseProblem(const LogTable &table, bool forWriting, const KELOFAILURE &failure) {
    const std::string outside = ReasonFromOutside(table, forWriting);
    return std::string(forWriting ? "cannot change " : "cannot read ") + table.path + ": " +
           (outside.empty() ? ReasonFromInside(table, failure) : outside);
}

} // namespace kelo::tool
