#include "receive/spool_report.h"

#include <sqlite3.h>
#include <unistd.h>

#include <cerrno>
#include <cstdlib>
#include <filesystem>

#include "base/folder.h"

namespace kelo::tool {

std::string TryLoadPlaces(const std::string &path, SpoolReader reader, std::vector<SpoolPlace> &places) {
    places.clear();
    if (access(path.c_str(), F_OK) != 0 && errno == ENOENT)
        return "";
    try {
        SqliteConnection database(path,
                                  {.mode = SqliteMode::kWrite, .busyTimeoutMs = 1000, .trustsSchema = false});
        places = LoadPlaces(database, reader);
    } catch (const SqliteError &error) {
        return error.code == SQLITE_CORRUPT ? "" : error.what();
    }
    return "";
}

bool WriteSpoolDone(const std::string &root, const std::string &content) {
    const Folder folder(std::filesystem::path(ReceiverStatePath(root)).parent_path().string());
    return folder.Write("spool-done", content, folder, "spool-done.new");
}

uint64_t SpoolLimit(const std::string &spool) {
    const std::optional<std::string> text = ReadWhole(spool + "/limit");
    return text ? std::strtoull(text->c_str(), nullptr, 10) : 0;
}

} // namespace kelo::tool
