#pragma once

#include <sqlite3.h>

#include <cerrno>
#include <memory>
#include <string>

#include "common/failure.h"
#include "keloplatform/kelodb.h"

namespace kelo {

struct DbConnectionCloser {
    void operator()(DBConnect_tag *connection) const { KELODBClose(connection); }
};
struct DbResultFreer {
    void operator()(DBResult_tag *result) const { KELODBFreeResult(result); }
};

// A connection that closes, and a result that frees, when it goes out of scope. Declare the result after the
// connection.
using DbConnection = std::unique_ptr<DBConnect_tag, DbConnectionCloser>;
using DbResult = std::unique_ptr<DBResult_tag, DbResultFreer>;

// Opens the database at `path`; null on failure. A path with a NUL byte would name another file and fails.
inline DbConnection Connect(const std::string &path) {
    if (path.find('\0') != std::string::npos)
        return nullptr;
    return DbConnection(KELODBConnect(nullptr, nullptr, nullptr, path.c_str()));
}

// The same for a public function, which fails with it: a failure becomes the thread's last one.
inline DbConnection ConnectOrFail(const std::string &path) {
    errno = 0;
    DbConnection connection = Connect(path);
    if (connection == nullptr && path.find('\0') != std::string::npos)
        Fail(KELO_FAILURE_ARGUMENT, path, "KELODBConnect", "the path holds a NUL byte");
    else if (connection == nullptr)
        FailPlatform(path, "KELODBConnect");
    return connection;
}

// Whether the file was moved or removed since it was opened, so that another one may have its path.
inline bool HasMoved(DBConnect_tag *connection) {
    int hasMoved = 0;
    sqlite3_file_control(KELODBInternalDBHdlGet(connection), "main", SQLITE_FCNTL_HAS_MOVED, &hasMoved);
    return hasMoved != 0;
}

} // namespace kelo
