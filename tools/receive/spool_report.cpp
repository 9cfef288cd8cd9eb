#include "receive/spool_report.h"

#include <sqlite3.h>
#include <sys/statvfs.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <filesystem>
#include <sstream>

#include "base/folder.h"

namespace kelo::tool {

std::string TryLoad(const std::string &path, const std::function<void(SqliteConnection &)> &read) {
    if (access(path.c_str(), F_OK) != 0 && errno == ENOENT)
        return "";
    try {
        SqliteConnection database(path,
                                  {.mode = SqliteMode::kWrite, .busyTimeoutMs = 1000, .trustsSchema = false});
        read(database);
    } catch (const SqliteError &error) {
        return error.code == SQLITE_CORRUPT ? "" : error.what();
    }
    return "";
}

bool WriteSpoolDone(const std::string &root, const std::string &content) {
    const Folder folder(std::filesystem::path(ReceiverStatePath(root)).parent_path().string());
    return folder.Write("spool-done", content, folder, "spool-done.new");
}

uint64_t SpoolLimit(const std::string &spool, uint64_t bytes) {
    std::istringstream text(ReadWhole(spool + "/limit").value_or(""));
    uint64_t limit = 0;
    uint64_t spare = 0;
    struct statvfs volume {};
    if (!(text >> limit >> spare) || statvfs(spool.c_str(), &volume) != 0)
        return limit;
    const uint64_t free = static_cast<uint64_t>(volume.f_bavail) * volume.f_frsize;
    return std::min(limit, bytes + (free > spare ? free - spare : 0));
}

} // namespace kelo::tool
