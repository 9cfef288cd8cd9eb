#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <filesystem>
#include <memory>
#include <system_error>
#include <utility>

#include "keloplatform/kelodb.h"
#include "keloplatform/skip_index.h"
#include "skip_index/builder.h"
#include "skip_index/database_state.h"
#include "skip_index/skip_index.h"

using namespace kelo::platform;

namespace {

using Connection = std::unique_ptr<DBConnect_tag, decltype(&KELODBClose)>;

Connection Connect(const char *path) {
    return {KELODBConnect(nullptr, nullptr, nullptr, path), &KELODBClose};
}

void EndReading(sqlite3 *db) {
    sqlite3_exec(db, "ROLLBACK", nullptr, nullptr, nullptr);
}

int ResultOf(BuildResult result) {
    switch (result) {
    case BuildResult::kComplete:
        return KELODB_SKIP_COMPLETE;
    case BuildResult::kMore:
        return KELODB_SKIP_MORE;
    case BuildResult::kBusy:
        return KELODB_SKIP_BUSY;
    case BuildResult::kNoTable:
        return KELODB_SKIP_NO_TABLE;
    case BuildResult::kTooSparse:
        return KELODB_SKIP_SPARSE;
    case BuildResult::kNotAllowed:
        return KELODB_SKIP_NOT_ALLOWED;
    case BuildResult::kNoRoom:
        return KELODB_SKIP_NO_ROOM;
    case BuildResult::kFailed:
        break;
    }
    return KELODB_SKIP_FAILED;
}

} // namespace

int KELODBSkipIndexBuild(const char *path, int maxMs) {
    try {
        const auto now = std::chrono::steady_clock::now();
        const Connection connection = Connect(path);
        if (connection == nullptr)
            return KELODB_SKIP_FAILED;
        const auto deadline =
            maxMs > 0 ? now + std::chrono::milliseconds(maxMs) : std::chrono::steady_clock::time_point::max();
        return ResultOf(BuildIndex(KELODBInternalDBHdlGet(connection.get()), deadline));
    } catch (const std::bad_alloc &) {
        errno = ENOMEM;
        return KELODB_SKIP_FAILED;
    }
}

int KELODBSkipIndexGet(DBConnect_tag *connection, KELODBSkipIndex *index) {
    *index = {};
    try {
        sqlite3 *db = KELODBInternalDBHdlGet(connection);
        const auto opened = SkipIndex::Open(db);
        if (sqlite3_exec(db, "BEGIN", nullptr, nullptr, nullptr) != SQLITE_OK)
            return -1;
        const std::unique_ptr<sqlite3, decltype(&EndReading)> transaction(db, &EndReading);
        index->isPossible = HasIndexableTable(db) ? 1 : 0;
        index->newestId = LargestIdEver(db);
        if (index->isPossible != 0 && opened && opened->Fits(db)) {
            index->isThere = 1;
            index->firstId = opened->Header().FirstId();
            index->endId = opened->Header().EndId();
            index->diskBytes = opened->File().DiskBytes();
        }
        return 0;
    } catch (const std::bad_alloc &) {
        return -1;
    }
}

int64_t KELODBSkipIndexLag() {
    return std::exchange(lastLag, -1);
}

int KELODBSkipIndexRemove(const char *path) {
    try {
        std::error_code unresolved;
        const std::string database = std::filesystem::weakly_canonical(path, unresolved);
        const std::string index = IndexPathOf(unresolved ? path : database);
        struct stat info {};
        if (lstat(index.c_str(), &info) != 0)
            return errno == ENOENT ? 1 : -1;
        if (!S_ISREG(info.st_mode)) {
            errno = EINVAL;
            return -1;
        }
        return unlink(index.c_str());
    } catch (const std::bad_alloc &) {
        errno = ENOMEM;
        return -1;
    }
}
